#pragma once

#include "Edit.h"
#include "shell/CommandLine.h"
#include "shell/Failure.h"

#include <cstddef>
#include <memory>
#include <string>
#include <vector>

namespace ModelingProgram {

/// A step of `modeling run`: an edit whose options are set.
struct Step {
    EditKind const* kind;
    std::unique_ptr<Edit> edit;
    CommandDescription options; // as declared, with the given values
    std::string help; // to be printed instead of running anything; mostly empty
};

/// A failure of a step, which the sentence names.
class StepFailure : public Failure {
public:
    StepFailure(std::size_t number, Failure const& failure)
        : Failure(failure)
        , step(number)
    {
    }

    std::size_t step; // counted from 1
};

/// "step 2 (subdivide)"
std::string titleOf(std::size_t number, std::string const& name);

/// The kind of a step, or a failure that suggests a similar name.
/// \param number  counted from 1, for messages
EditKind const& editKindOf(std::string const& name, std::size_t number);

/// What a step of this kind can be given.
CommandDescription describeStep(EditKind const& kind);

/// Parses the name of a step and its options, as the command of the same name does.
/// \throws Failure  that names the step
Step parseStep(std::vector<std::string> const& words, std::size_t number);

/// Parses steps that are separated by semicolons: "triangulate; subdivide --relative 0.01".
std::vector<Step> parseSteps(std::string const& text);

/// Refuses steps that cannot follow one another, or do not fit the number of files.
/// \throws StepFailure, Failure
void requireChain(std::vector<Step> const& steps, std::size_t fileCount);

/// Refuses steps whose options are wrong whatever the geometry is, or whose result the format of the output cannot hold.
/// \throws StepFailure, Failure
void requireFit(std::vector<Step> const& steps, Output const& out);

/// Reads the files, runs the steps and writes the last result. The report gets one part per step.
void runSteps(
    std::vector<Step>& steps, std::vector<std::filesystem::path> const& files, Output const& out, Report& report);

}
