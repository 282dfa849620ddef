#pragma once

#include "shell/CommandLine.h"
#include "shell/Report.h"

#include <OrvanCore/Array.h>
#include <TessaraObject/Object.h>

#include <filesystem>
#include <string>
#include <vector>

namespace ModelingProgram {

/// How the command line picks elements: by exactly one of these, or all others if inverted.
struct Selection {
    std::filesystem::path indices; // a text file of indices
    std::vector<float> box; // two opposite corners
    std::string attribute; // picks elements whose value is not zero
    bool isInverted = false;
};

/// The kind of elements to pick, and its name in messages.
struct Pickable {
    char const* component;
    char const* singular;
    char const* plural;
};

/// Adds the options to a command.
void addSelection(Pickable const& elements, Selection& selection, Command& command);

/// True for each picked element. Adds their number to the report. A face is in the box if all of its corners are;
/// points on its boundary are in it.
/// \pre  the object is valid
Orvan::Array<bool> pickElements(
    Selection const& selection, Pickable const& elements, Tessara::Object const& object, Report& report);

}
