#pragma once

#include "Scanner.h"

#include <string>

#include <dlfcn.h>

namespace ModelingProgram {

/// A module with the code that includes a large library, loaded when a file of its format is first read or written. It
/// remains loaded until the program ends.
class CodecModule {
public:
    /// \param format  what messages call the files
    CodecModule(char const* library, char const* format)
        : format_(format)
        , library_(::dlopen(library, RTLD_NOW | RTLD_LOCAL))
    {
        if (!library_)
            problem_ = ::dlerror();
    }

    /// \throws FileError  if the module could not be loaded
    template <class Function> Function* function(char const* name) const
    {
        void* const symbol = library_ ? ::dlsym(library_, name) : nullptr;
        if (!symbol)
            throw FileError(std::string(format_) + " files can be neither read nor written: " + problem_);
        return reinterpret_cast<Function*>(symbol);
    }

private:
    char const* format_;
    void* library_;
    std::string problem_;
};

}
