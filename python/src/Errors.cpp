#include "Errors.h"

#include "Bindings.h"

#include "files/GeometryFile.h"
#include "shell/Failure.h"

#include <algorithm>
#include <iterator>
#include <string_view>

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

    bool isNameCharacter(char c)
    {
        return (c >= 'a' && c <= 'z') || c == '-';
    }

    /// Whether the text ends with a command and a blank: "modeling repair ".
    bool endsWithCommand(std::string_view text)
    {
        constexpr std::string_view program = "modeling ";
        if (!text.ends_with(' '))
            return false;
        text.remove_suffix(1);
        std::size_t const size = text.size();
        while (!text.empty() && isNameCharacter(text.back()))
            text.remove_suffix(1);
        return text.size() != size && text.ends_with(program);
    }

    /// The sentence with arguments of Python instead of options: "min_value" for "--min-value". Options of a whole command
    /// line, "modeling repair --only fill", stay.
    std::string withArguments(std::string const& sentence)
    {
        std::string text;
        for (std::size_t i = 0; i != sentence.size();) {
            std::size_t end = i + 2;
            bool const isOption = sentence.compare(i, 2, "--") == 0 && end < sentence.size() && sentence[end] != '-'
                && isNameCharacter(sentence[end]);
            if (!isOption) {
                text += sentence[i++];
                continue;
            }
            while (end != sentence.size() && isNameCharacter(sentence[end]))
                ++end;
            if (endsWithCommand(std::string_view(sentence).substr(0, i)))
                text.append(sentence, i, end - i);
            else
                std::replace_copy(sentence.begin() + static_cast<std::ptrdiff_t>(i + 2),
                    sentence.begin() + static_cast<std::ptrdiff_t>(end), std::back_inserter(text), '-', '_');
            i = end;
        }
        return text;
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
