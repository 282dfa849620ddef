#include "Hdf5Library.h"

namespace ModelingProgram {

namespace {

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
        return message.empty() ? "the HDF5 library fails" : "the HDF5 library says \"" + message + "\"";
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
