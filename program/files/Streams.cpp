#include "Streams.h"

#include "GeometryFile.h"

#include <OrvanCppOpSDK/Job.h>

#include <cerrno>
#include <charconv>
#include <cstring>
#include <map>
#include <memory>
#include <string_view>

#include <fcntl.h>
#include <poll.h>
#include <sys/stat.h>
#include <sys/sysmacros.h>
#include <unistd.h>

namespace ModelingProgram {

namespace {

    constexpr int kMillisecondsBetweenChecks = 100; // of whether the job is cancelled

    int standardOutput = STDOUT_FILENO; // where files written to /dev/stdout go

    [[noreturn]] void refuse(std::filesystem::path const& file, std::string const& why)
    {
        throw FileError(file.string() + " cannot be read: " + why);
    }

    void stopIfCancelled()
    {
        if (Orvan::isJobCancelled())
            throw Cancelled();
    }

    bool isNull(struct stat const& status)
    {
        constexpr unsigned int kMemoryDevices = 1, kNull = 3;
        return S_ISCHR(status.st_mode) && status.st_rdev == makedev(kMemoryDevices, kNull);
    }

    /// Opens a file that is not a regular one, without waiting for the other end of a pipe.
    int openStream(std::filesystem::path const& file)
    {
        if (auto const descriptor = descriptorOf(file)) {
            int const copy = ::fcntl(*descriptor, F_DUPFD_CLOEXEC, 0);
            if (copy < 0)
                refuse(file, std::strerror(errno));
            return copy;
        }
        struct stat status = {};
        if (::stat(file.c_str(), &status) != 0)
            refuse(file, errno == ENOENT ? "there is no such file" : std::strerror(errno));
        if (S_ISDIR(status.st_mode))
            refuse(file, "it is a folder");
        if (!S_ISFIFO(status.st_mode) && !isNull(status))
            refuse(file, "it is neither a regular file nor a pipe");
        int const opened = ::open(file.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
        if (opened < 0)
            refuse(file, std::strerror(errno));
        return opened;
    }

    /// Reads what has arrived. Waits until there is something, which may be the end.
    std::size_t readSome(int descriptor, char* buffer, std::size_t bytes, std::filesystem::path const& file)
    {
        for (;;) {
            stopIfCancelled();
            pollfd waiting{descriptor, POLLIN, 0};
            if (::poll(&waiting, 1, kMillisecondsBetweenChecks) <= 0)
                continue; // interrupted, or nothing yet
            ssize_t const count = ::read(descriptor, buffer, bytes);
            if (count >= 0)
                return static_cast<std::size_t>(count);
            if (errno != EINTR && errno != EAGAIN)
                refuse(file, std::strerror(errno));
        }
    }

    void copyStream(int from, int to, std::filesystem::path const& file)
    {
        constexpr std::size_t kBufferBytes = 1 << 20;
        static_cast<void>(::fcntl(from, F_SETPIPE_SZ, kBufferBytes)); // fewer switches between the two programs
        auto const buffer = std::make_unique_for_overwrite<char[]>(kBufferBytes);
        while (std::size_t bytes = readSome(from, buffer.get(), kBufferBytes, file))
            for (char const* data = buffer.get(); bytes != 0;) {
                ssize_t const written = ::write(to, data, bytes);
                if (written < 0 && errno == EINTR)
                    continue;
                if (written < 0)
                    refuse(file,
                        "its copy in " + std::filesystem::temp_directory_path().string()
                            + " cannot be written (TMPDIR names another folder): " + std::strerror(errno));
                data += written;
                bytes -= static_cast<std::size_t>(written);
            }
    }

    /// A regular file that is redirected to a descriptor needs no copy, unless something has been read from it.
    bool isWholeFile(int descriptor)
    {
        struct stat status = {};
        return ::fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode) && ::lseek(descriptor, 0, SEEK_CUR) == 0
            && ::access(nameOfDescriptor(descriptor).c_str(), R_OK) == 0;
    }

    /// \return the descriptor of a regular file with the content of a stream
    int readStream(std::filesystem::path const& file)
    {
        struct Closed {
            int descriptor;
            ~Closed() { ::close(descriptor); }
        };
        int const stream = openStream(file);
        if (isWholeFile(stream))
            return stream;
        Closed const closed{stream};
        int const copy = openTemporary();
        if (copy < 0)
            refuse(file, std::string("there is no place for a copy (TMPDIR names a folder): ") + std::strerror(errno));
        try {
            copyStream(stream, copy, file);
        } catch (...) {
            ::close(copy);
            throw;
        }
        return copy;
    }

}

std::optional<int> descriptorOf(std::filesystem::path const& file)
{
    std::string_view const name = file.native();
    if (name == kStandardInput)
        return STDIN_FILENO;
    if (name == kStandardOutput)
        return standardOutput;
    if (name == "/dev/stderr")
        return STDERR_FILENO;
    for (std::string_view const folder : {"/dev/fd/", "/proc/self/fd/"}) {
        int number = 0;
        auto const [end, error] =
            std::from_chars(name.data() + std::min(folder.size(), name.size()), name.data() + name.size(), number);
        if (name.starts_with(folder) && error == std::errc{} && end == name.data() + name.size() && number >= 0)
            return number == STDOUT_FILENO ? standardOutput : number;
    }
    return std::nullopt;
}

std::string nameOfDescriptor(int descriptor)
{
    return "/proc/self/fd/" + std::to_string(descriptor);
}

bool isStream(std::filesystem::path const& file)
{
    std::error_code ignored;
    std::filesystem::file_status const status = std::filesystem::status(file, ignored);
    return descriptorOf(file)
        || (std::filesystem::exists(status) && !std::filesystem::is_regular_file(status)
            && !std::filesystem::is_directory(status));
}

bool isStandardOutput(std::filesystem::path const& file)
{
    if (descriptorOf(file) == descriptorOf(kStandardOutput))
        return true;
    struct stat named = {}, output = {};
    return ::stat(file.c_str(), &named) == 0 && ::fstat(STDOUT_FILENO, &output) == 0 && S_ISFIFO(output.st_mode)
        && named.st_dev == output.st_dev && named.st_ino == output.st_ino;
}

void reserveStandardOutput()
{
    int const copy = ::fcntl(STDOUT_FILENO, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
    if (copy < 0)
        return; // it is closed, so that writing to it fails
    standardOutput = copy;
    ::dup2(STDERR_FILENO, STDOUT_FILENO);
}

std::filesystem::path regularFileOf(std::filesystem::path const& file)
{
    static std::map<std::filesystem::path, int> copies;
    std::error_code ignored;
    if (!descriptorOf(file) && std::filesystem::is_regular_file(file, ignored))
        return file;
    auto copy = copies.find(file);
    if (copy == copies.end())
        copy = copies.emplace(file, readStream(file)).first;
    return nameOfDescriptor(copy->second);
}

int openForWriting(std::filesystem::path const& file)
{
    if (auto const descriptor = descriptorOf(file))
        return ::fcntl(*descriptor, F_DUPFD_CLOEXEC, 0);
    for (;;) {
        int const opened = ::open(file.c_str(), O_WRONLY | O_NONBLOCK | O_CLOEXEC);
        if (opened >= 0) {
            ::fcntl(opened, F_SETFL, O_WRONLY);
            return opened;
        }
        std::error_code ignored;
        if (errno != ENXIO || !std::filesystem::is_fifo(file, ignored))
            return -1;
        stopIfCancelled();
        ::poll(nullptr, 0, kMillisecondsBetweenChecks);
    }
}

int openTemporary()
{
    std::error_code error;
    std::filesystem::path const folder = std::filesystem::temp_directory_path(error);
    if (error) {
        errno = error.value();
        return -1;
    }
    int const unnamed = ::open(folder.c_str(), O_RDWR | O_TMPFILE | O_CLOEXEC, S_IRUSR | S_IWUSR);
    if (unnamed >= 0)
        return unnamed;
    std::string name = (folder / "modeling-XXXXXX").string(); // the file system has no files without names
    int const named = ::mkostemp(name.data(), O_CLOEXEC);
    if (named >= 0)
        ::unlink(name.c_str());
    return named;
}

}
