#include "Hdf5Library.h"

#include <string_view>

namespace ModelingProgram {

namespace {

    /// Of a message with all details of a write, what the system says: "... error message = 'No space left', ...".
    std::string shortened(std::string const& message)
    {
        constexpr std::string_view kBegin = "error message = '";
        std::size_t const begin = message.find(kBegin);
        if (begin == std::string::npos)
            return "the HDF5 library says \"" + message + "\"";
        std::size_t const first = begin + kBegin.size();
        return message.substr(first, message.find('\'', first) - first);
    }

    /// The innermost error is the cause of the others.
    std::string firstMessage()
    {
        std::string message;
        H5Ewalk2(
            H5E_DEFAULT, H5E_WALK_UPWARD,
            [](unsigned int depth, H5E_error2_t const* error, void* text) -> herr_t {
                if (depth == 0 && error->desc)
                    *static_cast<std::string*>(text) = error->desc;
                return 0;
            },
            &message);
        H5Eclear2(H5E_DEFAULT);
        return message.empty() ? "the HDF5 library fails" : shortened(message);
    }

}

Hdf5Error::Hdf5Error()
    : std::runtime_error(firstMessage())
{
}

void silenceHdf5()
{
    H5Eset_auto2(H5E_DEFAULT, nullptr, nullptr);
}

}
