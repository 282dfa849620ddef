#include "Errors.h"

#include "Bindings.h"

#include "files/GeometryFile.h"
#include "shell/Failure.h"

#include <algorithm>
#include <regex>

namespace ModelingPython {

namespace {

    using ModelingProgram::ExitCode;
    using ModelingProgram::Failure;

    constexpr char kErrors[] = "modeling.errors";
    // Warnings name the caller of the function in Python that calls us.
    constexpr int kCallerOfWrapper = 2;

    py::object classNamed(char const* name)
    {
        return py::module_::import(kErrors).attr(name);
    }

    /// The sentence with arguments of Python instead of options: "min_value" for "--min-value". Options of a whole command
    /// line, "modeling repair --only fill", stay.
    std::string withArguments(std::string const& sentence)
    {
        static std::regex const option("(modeling [a-z-]+ )?--([a-z][a-z-]*)");
        std::string text;
        auto rest = sentence.begin();
        for (std::sregex_iterator found(sentence.begin(), sentence.end(), option), end; found != end; ++found) {
            std::smatch const& match = *found;
            text.append(rest, match[0].first);
            std::string name = match[1].matched ? match.str() : match[2].str();
            if (!match[1].matched)
                std::replace(name.begin(), name.end(), '-', '_');
            text += name;
            rest = match[0].second;
        }
        return text.append(rest, sentence.end());
    }

    /// Sets the Python exception for a failure of the program.
    void setFailure(Failure const& failure)
    {
        py::list reasons;
        std::string text = withArguments(failure.what());
        for (std::string const& reason : failure.reasons) {
            text += "\n  " + reason;
            reasons.append(textOf(reason));
        }
        bool const isInvalid = failure.code == ExitCode::Invalid;
        py::object const kind = failure.code == ExitCode::OutOfMemory
            ? py::reinterpret_borrow<py::object>(PyExc_MemoryError)
            : classNamed(isInvalid                   ? "InvalidGeometry"
                    : failure.code == ExitCode::File ? "FileError"
                                                     : "Refusal");
        py::object const exception = kind(textOf(text));
        if (failure.code == ExitCode::Refused)
            exception.attr("reasons") = py::tuple(reasons);
        PyErr_SetObject(kind.ptr(), exception.ptr());
    }

    void translate(std::exception_ptr exception)
    {
        try {
            if (exception)
                std::rethrow_exception(exception);
        } catch (Failure const& failure) {
            setFailure(failure);
        } catch (ModelingProgram::FileError const& error) {
            PyErr_SetObject(classNamed("FileError").ptr(), textOf(error.what()).ptr());
        }
    }

}

py::str textOf(std::string const& text)
{
    return py::reinterpret_steal<py::str>(
        PyUnicode_DecodeUTF8(text.data(), static_cast<Py_ssize_t>(text.size()), "surrogateescape"));
}

void refuse(std::string const& sentence, std::vector<std::string> const& reasons)
{
    throw Failure(ExitCode::Refused, sentence, reasons);
}

void refuseInvalid(std::string const& sentence)
{
    throw Failure(ExitCode::Invalid, sentence);
}

void warn(std::string const& sentence)
{
    if (PyErr_WarnFormat(classNamed("GeometryWarning").ptr(), kCallerOfWrapper, "%U", textOf(sentence).ptr()) != 0)
        throw py::error_already_set();
}

void bindErrors(py::module_&)
{
    py::register_local_exception_translator(translate);
}

}
