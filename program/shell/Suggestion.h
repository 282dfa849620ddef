#pragma once

#include <string>
#include <vector>

namespace ModelingProgram {

/// "; did you mean ...?" with the name that is most similar to a misspelled one; empty if none is similar.
std::string suggestionFor(std::string const& text, std::vector<std::string> const& names);

}
