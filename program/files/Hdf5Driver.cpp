#include "Hdf5Driver.h"

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <new>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace ModelingProgram {

namespace {

    constexpr haddr_t kMostBytes = (haddr_t{1} << 63) - 1;

    /// What the library knows as a pointer to the base.
    struct File : H5FD_t {
        int descriptor = -1;
        haddr_t allocated = 0; // the end of what the library uses
        haddr_t end = 0; // of the file
    };

    File& fileOf(H5FD_t* file)
    {
        return *static_cast<File*>(file);
    }

    File const& fileOf(H5FD_t const* file)
    {
        return *static_cast<File const*>(file);
    }

    herr_t fail(hid_t what, char const* why)
    {
        H5Epush2(H5E_DEFAULT, "", "", 0, H5E_ERR_CLS, H5E_IO, what, "error message = '%s'", why);
        return -1;
    }

    H5FD_t* open(char const* name, unsigned int flags, hid_t, haddr_t)
    {
        bool const writes = (flags & H5F_ACC_RDWR) != 0;
        int const descriptor = ::open(name,
            (writes ? O_RDWR : O_RDONLY) | ((flags & H5F_ACC_TRUNC) != 0 ? O_TRUNC : 0)
                | ((flags & H5F_ACC_CREAT) != 0 ? O_CREAT : 0) | O_CLOEXEC,
            0666);
        struct stat status = {};
        if (descriptor < 0 || ::fstat(descriptor, &status) != 0) {
            fail(H5E_CANTOPENFILE, std::strerror(errno));
            return nullptr;
        }
        auto* const file = new (std::nothrow) File();
        if (!file) {
            ::close(descriptor);
            return nullptr;
        }
        file->descriptor = descriptor;
        file->end = static_cast<haddr_t>(status.st_size);
        return file;
    }

    herr_t close(H5FD_t* base)
    {
        File* const file = &fileOf(base);
        int const result = ::close(file->descriptor);
        int const error = errno;
        delete file;
        return result == 0 ? 0 : fail(H5E_CANTCLOSEFILE, std::strerror(error));
    }

    /// Calls ::pread or ::pwrite until all bytes are moved.
    template <class Move, class Byte>
    herr_t moveAll(Move move, hid_t what, File const& file, haddr_t address, std::size_t bytes, Byte* data)
    {
        while (bytes != 0) {
            ssize_t const count = move(file.descriptor, data, bytes, static_cast<off_t>(address));
            if (count < 0 && errno == EINTR)
                continue;
            if (count <= 0)
                return fail(what, count < 0 ? std::strerror(errno) : "the file ends before");
            data += count;
            address += static_cast<haddr_t>(count);
            bytes -= static_cast<std::size_t>(count);
        }
        return 0;
    }

    /// Bytes that are used but not written yet are zeros.
    herr_t read(H5FD_t* base, H5FD_mem_t, hid_t, haddr_t address, std::size_t bytes, void* target)
    {
        File const& file = fileOf(base);
        std::size_t const inside = address >= file.end ? 0 : std::min<haddr_t>(bytes, file.end - address);
        std::memset(static_cast<char*>(target) + inside, 0, bytes - inside);
        return moveAll(::pread, H5E_READERROR, file, address, inside, static_cast<char*>(target));
    }

    herr_t write(H5FD_t* base, H5FD_mem_t, hid_t, haddr_t address, std::size_t bytes, void const* source)
    {
        File& file = fileOf(base);
        if (moveAll(::pwrite, H5E_WRITEERROR, file, address, bytes, static_cast<char const*>(source)) < 0)
            return -1;
        file.end = std::max(file.end, address + bytes);
        return 0;
    }

    herr_t truncate(H5FD_t* base, hid_t, hbool_t)
    {
        File& file = fileOf(base);
        if (file.allocated == file.end)
            return 0;
        if (::ftruncate(file.descriptor, static_cast<off_t>(file.allocated)) != 0)
            return fail(H5E_WRITEERROR, std::strerror(errno));
        file.end = file.allocated;
        return 0;
    }

    H5FD_class_t makeDriver()
    {
        H5FD_class_t driver = {};
#ifdef H5FD_CLASS_VERSION // newer versions of the library
        driver.version = H5FD_CLASS_VERSION;
        driver.value = H5FD_RESERVED;
#endif
        driver.name = "descriptor";
        driver.maxaddr = kMostBytes;
        driver.fc_degree = H5F_CLOSE_WEAK;
        driver.open = open;
        driver.close = close;
        driver.query = [](H5FD_t const*, unsigned long* flags) -> herr_t {
            *flags = H5FD_FEAT_AGGREGATE_METADATA | H5FD_FEAT_ACCUMULATE_METADATA | H5FD_FEAT_DATA_SIEVE
                | H5FD_FEAT_AGGREGATE_SMALLDATA | H5FD_FEAT_DEFAULT_VFD_COMPATIBLE;
            return 0;
        };
        driver.get_eoa = [](H5FD_t const* file, H5FD_mem_t) { return fileOf(file).allocated; };
        driver.set_eoa = [](H5FD_t* file, H5FD_mem_t, haddr_t end) -> herr_t {
            fileOf(file).allocated = end;
            return 0;
        };
        driver.get_eof = [](H5FD_t const* file, H5FD_mem_t) { return fileOf(file).end; };
        driver.read = read;
        driver.write = write;
        driver.truncate = truncate;
        constexpr H5FD_mem_t kKinds[] = H5FD_FLMAP_DICHOTOMY; // structure and values apart, as in all files
        static_assert(sizeof(kKinds) == sizeof(driver.fl_map));
        std::memcpy(driver.fl_map, kKinds, sizeof(kKinds));
        return driver;
    }

}

void useDescriptors(hid_t accessProperties)
{
    static H5FD_class_t const driver = makeDriver();
    static hid_t const registered = H5FDregister(&driver);
    checked(H5Pset_driver(accessProperties, checked(registered), nullptr));
}

}
