#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace ModelingProgram {

/// Splits a text into commands at semicolons and line ends, and these into words at spaces and tabs, as a shell does:
/// '...' is literal, in "..." a backslash escapes " and \, elsewhere it escapes any character. Commands without words
/// are left out.
/// \throws Failure  if a quotation has no end
std::vector<std::vector<std::string>> splitCommands(std::string_view text);

/// The words as they can be typed: quoted where a shell would take them for something else.
std::string quotedCommand(std::vector<std::string> const& words);

}
