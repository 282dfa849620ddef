#include "Bindings.h"
#include "Cancellation.h"

#include "Program.h"
#include "commands/Operation.h"
#include "commands/Recipe.h"
#include "commands/Steps.h"
#include "files/Streams.h"
#include "geometry/MeshRequirements.h"
#include "shell/Failure.h"
#include "shell/MemoryLimit.h"
#include "shell/Report.h"

#include <OrvanCppOpSDK/Job.h>

#include <pybind11/stl.h>
#include <pybind11/stl/filesystem.h>
#include <tbb/task_arena.h>

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <future>
#include <optional>
#include <shared_mutex>
#include <string>
#include <utility>
#include <vector>

namespace ModelingPython {

namespace py = pybind11;
namespace fs = std::filesystem;
using namespace ModelingProgram;

namespace {

    py::object toPython(Json const& document)
    {
        return py::module_::import("json").attr("loads")(toText(document));
    }

    /// A new exception class of the module.
    void addException(py::module_& module, char const* name, PyObject* base, char const* manual)
    {
        std::string const fullName = std::string("modeling._modeling.") + name;
        module.attr(name) =
            py::reinterpret_steal<py::object>(PyErr_NewExceptionWithDoc(fullName.c_str(), manual, base, nullptr));
    }

    /// An exception of a class of the module. Text of files may not be UTF-8.
    py::object makeException(char const* name, std::string const& sentence)
    {
        py::object const text = py::reinterpret_steal<py::object>(
            PyUnicode_DecodeUTF8(sentence.data(), static_cast<Py_ssize_t>(sentence.size()), "surrogateescape"));
        return py::module_::import("modeling._modeling").attr(name)(text);
    }

    [[noreturn]] void raise(py::object const& exception)
    {
        PyErr_SetObject(reinterpret_cast<PyObject*>(Py_TYPE(exception.ptr())), exception.ptr());
        throw py::error_already_set();
    }

    [[noreturn]] void raise(RecipeFailure const& failure)
    {
        py::object const exception = makeException("RecipeError", failure.what());
        exception.attr("step") = failure.place.step;
        exception.attr("key") = failure.place.key;
        exception.attr("line") = failure.line;
        raise(exception);
    }

    [[noreturn]] void raise(Failure const& failure, Json const& report)
    {
        py::object const exception = makeException("RunError", failure.what());
        exception.attr("exit_code") = static_cast<int>(failure.code);
        exception.attr("reasons") = failure.reasons;
        exception.attr("report") = toPython(report);
        raise(exception);
    }

    bool isFile(OptionDescription const& option)
    {
        return option.kind == ValueKind::File && !option.given.empty();
    }

    std::size_t lineOf(RecipePlace const& place, Recipe const& recipe)
    {
        auto const line = recipe.lines.find(place);
        return line != recipe.lines.end() ? line->second : 0;
    }

    /// Refuses standard input and pipes, which belong to the program around this module.
    void refuseStreams(Recipe const& recipe)
    {
        for (std::size_t i = 0; i != recipe.steps.size(); ++i)
            for (OptionDescription const& option : recipe.steps[i].options.options)
                for (std::string const& file : option.given)
                    if (isFile(option) && (file == "-" || isStream(file))) {
                        RecipePlace const place{i + 1, option.name};
                        throw RecipeFailure({ExitCode::CommandLine,
                                                titleOf(i + 1, recipe.steps[i].kind->help.name) + ": \"" + option.name
                                                    + "\" has to be a file, and " + file + " is a stream"},
                            place, lineOf(place, recipe));
                    }
    }

    Recipe parseChecked(std::string const& text, std::string const& format)
    {
        Recipe recipe = parseRecipe(text);
        refuseStreams(recipe);
        checkRecipe(recipe, format.empty() ? recipe.output.format : "." + format);
        return recipe;
    }

    py::dict checkPythonRecipe(std::string const& text, std::string const& format)
    {
        try {
            Recipe const recipe = parseChecked(text, format);
            py::list files;
            for (std::size_t i = 0; i != recipe.steps.size(); ++i)
                for (OptionDescription const& option : recipe.steps[i].options.options)
                    if (isFile(option))
                        files.append(py::make_tuple(i, option.name, lineOf({i + 1, option.name}, recipe)));
            py::dict result;
            result["recipe"] = toPython(recipeOf(recipe.steps));
            result["files"] = files;
            result["format"] = recipe.output.format.empty() ? "" : recipe.output.format.substr(1);
            result["compress"] = recipe.output.compression;
            return result;
        } catch (RecipeFailure const& failure) {
            raise(failure);
        }
    }

    /// Whether the steps limit the memory of the process while they run. There is one limit and one job per process.
    bool limitsMemory(std::vector<Step> const& steps)
    {
        return std::any_of(steps.begin(), steps.end(), [](Step const& step) {
            auto const& options = step.options.options;
            return std::any_of(options.begin(), options.end(),
                [](OptionDescription const& option) { return option.name == "max-memory"; });
        });
    }

    struct Run {
        Recipe recipe;
        std::vector<fs::path> inputs;
        Output output;
        unsigned int threads = 0; // 0 for all
        Report report{"run"};

        void operator()()
        {
            static std::shared_mutex isRunning;
            std::shared_lock together(isRunning, std::defer_lock);
            std::unique_lock alone(isRunning, std::defer_lock);
            bool const isAlone = limitsMemory(recipe.steps);
            isAlone ? alone.lock() : together.lock();
            try {
                stopIfCancelled();
                if (threads == 0)
                    runSteps(recipe.steps, inputs, output, report);
                else // an arena limits this run only
                    tbb::task_arena(static_cast<int>(threads)).execute([&] {
                        runSteps(recipe.steps, inputs, output, report);
                    });
            } catch (...) {
                if (isAlone)
                    Orvan::setJobCancelled(false); // the limit may have set it
                throw;
            }
        }

        void stopIfCancelled() const
        {
            if (Orvan::isJobCancelled())
                throw Failure(ExitCode::Cancelled, "cancelled; nothing was written");
        }
    };

    /// Waits for the work without the interpreter lock. On the main thread, an exception that a handler of a signal
    /// raises, such as KeyboardInterrupt, cancels the work.
    void waitFor(std::future<void>& work)
    {
        constexpr std::chrono::milliseconds kInterval{50};
        std::optional<py::error_already_set> interrupt;
        for (bool isReady = false; !isReady;) {
            {
                Unlocked const unlocked;
                isReady = work.wait_for(kInterval) == std::future_status::ready;
            }
            if (!isReady && !interrupt && PyErr_CheckSignals() != 0) {
                interrupt.emplace();
                Orvan::setJobCancelled(true);
            }
        }
        if (interrupt) {
            Orvan::setJobCancelled(false);
            throw *interrupt;
        }
        work.get();
    }

    py::object runPythonRecipe(std::string const& text, std::vector<fs::path> const& inputs, fs::path const& output,
        bool force, std::string const& format, unsigned int compress, unsigned int threads, bool lenient,
        std::string const& require)
    {
        Run run;
        try {
            run.recipe = parseRecipe(text);
            refuseStreams(run.recipe);
        } catch (RecipeFailure const& failure) {
            raise(failure);
        }
        run.inputs = inputs;
        run.output = {output, format.empty() ? "" : "." + format, force, compress};
        run.threads = threads;
        Report& report = run.report;
        report.isJson = true;
        report.isSilent = true;
        report.reading.isLenient = lenient;
        report.reading.onSize = [](std::uint64_t bytes) { requireMemory(bytes, "an array of the file"); };
        try {
            for (fs::path const& file : inputs)
                if (isStream(file))
                    throw Failure(ExitCode::File, file.string() + " cannot be read: it is a stream");
            if (isStream(output))
                throw Failure(ExitCode::File, output.string() + " cannot be written: it is a stream");
            report.requirements = parseRequirements(require);
            std::future<void> work = std::async(std::launch::async, [&run] { run(); });
            waitFor(work);
        } catch (py::error_already_set const&) {
            throw;
        } catch (...) {
            Failure const failure = currentFailure();
            raise(failure, report.document);
        }
        report.document["exitCode"] = 0;
        return toPython(report.document);
    }

    py::tuple writableFormats()
    {
        py::list names;
        for (std::string const& name : geometryFormats())
            if (isWritableFormat("." + name))
                names.append(name);
        return py::tuple(names);
    }

}

void bindRecipes(py::module_& module)
{
    addException(module, "RecipeError", PyExc_ValueError,
        "A fault of a recipe. `step` (counted from 1, 0 for none), `key` and `line` (0 if unknown) say where.");
    addException(module, "RunError", PyExc_RuntimeError,
        "A run of a recipe that failed. `exit_code` is that of the program; `reasons` lists details; `report` is the "
        "report as far as it got.");
    module.attr("library_version") = MODELING_VERSION " build " MODELING_BUILD;
    module.attr("writable_formats") = writableFormats();
    module.attr("requirements") = py::tuple(py::cast(requirementNames()));
    module.def("check_recipe", &checkPythonRecipe, py::arg("text"), py::arg("format") = "",
        "Checks a recipe in JSON for one input file per run. If its output, or `format`, names a format, checks "
        "whether "
        "that can hold the result. Returns the `recipe` in its normal form, the places of its `files` as (index of the "
        "step, key, line), and `format` and `compress` of its output. Raises RecipeError.");
    module.def("run_recipe", &runPythonRecipe, py::arg("recipe"), py::arg("inputs"), py::arg("output"), py::kw_only(),
        py::arg("force") = false, py::arg("format") = "", py::arg("compress") = 0, py::arg("threads") = 0,
        py::arg("lenient") = false, py::arg("require") = "",
        "Reads the inputs, runs the steps of a recipe in JSON and writes the output, as `modeling run IN... OUT "
        "--recipe` does. Other Python threads run meanwhile. `threads` limits the threads of this run, 0 does not. "
        "Returns the document that --json prints. Raises RecipeError or RunError; the output is then unchanged.");
}

}
