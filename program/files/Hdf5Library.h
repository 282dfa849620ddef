#pragma once

#include <hdf5.h>

#include <stdexcept>
#include <string>
#include <utility>

namespace ModelingProgram {

/// A failure of the HDF5 library, with its own first message.
class Hdf5Error : public std::runtime_error {
public:
    Hdf5Error();
};

/// Throws `Hdf5Error` if a function of the library failed.
template <class Result> Result checked(Result result)
{
    if (result < 0)
        throw Hdf5Error();
    return result;
}

/// Owns a handle of the library. \tparam Close  the function that closes handles of this kind
template <herr_t (*Close)(hid_t)> class Hdf5Handle {
public:
    Hdf5Handle() = default;
    /// \throws Hdf5Error  if the function that returned the handle failed
    explicit Hdf5Handle(hid_t id)
        : id_(checked(id))
    {
    }
    Hdf5Handle(Hdf5Handle&& other) noexcept
        : id_(std::exchange(other.id_, H5I_INVALID_HID))
    {
    }
    Hdf5Handle& operator=(Hdf5Handle&& other) noexcept
    {
        std::swap(id_, other.id_);
        return *this;
    }
    ~Hdf5Handle()
    {
        if (id_ >= 0)
            Close(id_);
    }

    operator hid_t() const { return id_; } // implicit, to be passed to functions of the library
    /// Closes the handle and reports whether that failed.
    void close() { checked(Close(std::exchange(id_, H5I_INVALID_HID))); }

private:
    hid_t id_ = H5I_INVALID_HID;
};

using Hdf5FileHandle = Hdf5Handle<&H5Fclose>;
using Hdf5Group = Hdf5Handle<&H5Gclose>;
using Hdf5Dataset = Hdf5Handle<&H5Dclose>;
using Hdf5AnyObject = Hdf5Handle<&H5Oclose>;
using Hdf5Attribute = Hdf5Handle<&H5Aclose>;
using Hdf5Type = Hdf5Handle<&H5Tclose>;
using Hdf5Space = Hdf5Handle<&H5Sclose>;
using Hdf5Properties = Hdf5Handle<&H5Pclose>;

/// Keeps the library from printing its errors on this thread.
void silenceHdf5();

}
