#pragma once

#include "Program.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace TestSupport {

struct Result {
    int exitCode;
    std::string output;
    std::string messages;
};

/// Runs the program in this process.
inline Result run(std::vector<std::string> const& arguments)
{
    std::vector<char const*> line{"modeling"};
    for (std::string const& argument : arguments)
        line.push_back(argument.c_str());
    testing::internal::CaptureStdout();
    testing::internal::CaptureStderr();
    int const exitCode = ModelingProgram::runProgram(static_cast<int>(line.size()), line.data());
    return {exitCode, testing::internal::GetCapturedStdout(), testing::internal::GetCapturedStderr()};
}

}
