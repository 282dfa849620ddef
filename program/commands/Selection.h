#pragma once

#include "shell/CommandLine.h"
#include "shell/Report.h"

#include <OrvanCore/Array.h>
#include <TessaraObject/Object.h>

#include <filesystem>
#include <string>
#include <vector>

namespace ModelingProgram {

/// How a command line picks elements: by exactly one of these, or else by what that leaves.
struct Selection {
    std::filesystem::path indices; // a file of numbers
    std::vector<float> box; // two opposite corners
    std::string attribute; // picks where its value is not zero
    bool isInverted = false;
};

/// Elements to pick from, as they are called in sentences.
struct Pickable {
    char const* component;
    char const* singular;
    char const* plural;
};

/// Adds the options to a command.
void addSelection(Pickable const& elements, Selection& selection, Command& command);

/// True for the elements that are picked. Adds to the report how many these are. A face is in the box when all its
/// corners are, and points on the border are in it.
/// \pre  the object is valid
Orvan::Array<bool> pickElements(
    Selection const& selection, Pickable const& elements, Tessara::Object const& object, Report& report);

}
