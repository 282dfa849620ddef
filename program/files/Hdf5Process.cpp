#include "Hdf5Process.h"

#include "CodecModule.h"
#include "Hdf5Codec.h"
#include "Streams.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <fstream>
#include <new>
#include <optional>
#include <stdexcept>
#include <utility>

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

namespace ModelingProgram {

namespace {

    template <class Function> Function* hdf5Function(char const* name)
    {
        static CodecModule const module(kHdf5Codec, "HDF5");
        return module.function<Function>(name);
    }

    struct Descriptor {
        Descriptor() = default;
        Descriptor(Descriptor const&) = delete;
        Descriptor& operator=(Descriptor const&) = delete;
        ~Descriptor() { close(); }
        void close()
        {
            if (number >= 0)
                ::close(std::exchange(number, -1));
        }

        int number = -1;
    };

    void limit(__rlimit_resource resource, std::uint64_t most)
    {
        rlimit const limits{most, most};
        ::setrlimit(resource, &limits);
    }

    constexpr bool kLimitsMemory = !MODELING_IS_SANITIZED; // sanitizers reserve terabytes of address space

    /// Limits a process that reads the structure of a file.
    void limitUse(std::uint64_t fileBytes)
    {
        constexpr std::uint64_t kMemoryBytes = std::uint64_t{1} << 30;
        constexpr std::uint64_t kSeconds = 30, kBytesPerSecond = 1 << 20; // measured: 10 MB of structure per second
        std::uint64_t pages = 0;
        std::ifstream("/proc/self/statm") >> pages;
        if (kLimitsMemory)
            limit(RLIMIT_AS, pages * static_cast<std::uint64_t>(::sysconf(_SC_PAGESIZE)) + kMemoryBytes);
        limit(RLIMIT_CPU, kSeconds + fileBytes / kBytesPerSecond);
    }

    /// A new process ends with its parent, which decides what an interrupt means, and prints nothing.
    void settleIn()
    {
        for (int const signal : {SIGSEGV, SIGBUS, SIGABRT, SIGFPE, SIGILL, SIGXCPU, SIGPIPE})
            ::signal(signal, SIG_DFL);
        struct sigaction old = {};
        if (::sigaction(SIGQUIT, nullptr, &old) == 0 && old.sa_handler != SIG_IGN) // background jobs ignore it
            ::signal(SIGQUIT, SIG_DFL);
        for (int const signal : {SIGINT, SIGTERM, SIGHUP})
            ::signal(signal, SIG_IGN);
        ::prctl(PR_SET_PDEATHSIG, SIGKILL);
        limit(RLIMIT_CORE, 0);
        if (int const null = ::open("/dev/null", O_WRONLY); null >= 0) {
            ::dup2(null, STDOUT_FILENO);
            ::dup2(null, STDERR_FILENO);
        }
    }

    /// Reads a pipe to its end. Returns false if there is more than `most`.
    bool readAll(int pipe, std::uint64_t most, std::string& bytes)
    {
        std::array<char, 1 << 16> buffer;
        for (;;) {
            ssize_t const count = ::read(pipe, buffer.data(), buffer.size());
            if (count < 0 && errno == EINTR)
                continue;
            if (count <= 0)
                return count == 0;
            bytes.append(buffer.data(), static_cast<std::size_t>(count));
            if (bytes.size() > most)
                return false;
        }
    }

    /// Ends a process when it is no longer needed.
    struct Child {
        explicit Child(pid_t process)
            : id(process)
        {
        }
        Child(Child const&) = delete;
        Child& operator=(Child const&) = delete;
        ~Child()
        {
            if (id > 0) {
                ::kill(id, SIGKILL);
                waitForEnd();
            }
        }
        /// Returns whether it ended as it should.
        bool wait()
        {
            int const status = waitForEnd();
            if (WIFEXITED(status) && WEXITSTATUS(status) == kOutOfMemory)
                throw std::bad_alloc();
            return WIFEXITED(status) && WEXITSTATUS(status) == 0;
        }

        static constexpr int kFailed = 1, kOutOfMemory = 2;
        pid_t id;

    private:
        /// Returns the status of the process; that of a killed one if the system does not know.
        int waitForEnd()
        {
            int status = 0;
            pid_t ended = 0;
            while ((ended = ::waitpid(id, &status, 0)) < 0 && errno == EINTR) { }
            bool const isKnown = ended == std::exchange(id, -1);
            return isKnown ? status : SIGKILL;
        }
    };

    /// Calls `work` with a pipe in a new process. \return what it writes; nullopt if it crashes, or writes more than `most`
    /// \throws FileError, std::bad_alloc
    template <class Work>
    std::optional<std::string> runInProcess(std::filesystem::path const& file, std::uint64_t most, Work const& work)
    {
        ::signal(SIGCHLD, SIG_DFL); // if it is ignored, the system forgets how a process ended
        pid_t const parent = ::getpid();
        Descriptor reading, writing;
        int ends[2];
        pid_t process = -1;
        if (::pipe2(ends, O_CLOEXEC) == 0) {
            reading.number = ends[0];
            writing.number = ends[1];
            process = ::fork();
        }
        if (process < 0)
            throw FileError(file.string() + ": no process can be started: " + std::strerror(errno));
        if (process == 0) {
            try {
                settleIn();
                if (::getppid() != parent) // which ended before it was watched
                    ::_exit(Child::kFailed);
                work(writing.number);
            } catch (std::bad_alloc const&) {
                ::_exit(Child::kOutOfMemory);
            } catch (...) {
                ::_exit(Child::kFailed);
            }
            ::_exit(0);
        }
        Child child(process);
        writing.close();
        std::string bytes;
        if (!readAll(reading.number, most, bytes) || !child.wait())
            return std::nullopt;
        return bytes;
    }

}

std::string outlineOf(
    std::filesystem::path const& file, Hdf5Selection selection, std::string const& name, std::uint64_t fileBytes)
{
    // The outline repeats parts of the file: names, small values, and places.
    constexpr std::uint64_t kLeastBytes = 1 << 20;
    auto* const describe =
        hdf5Function<decltype(modelingDescribeHdf5)>("modelingDescribeHdf5"); // before the process starts
    std::filesystem::path const regular = regularFileOf(file);
    std::optional<std::string> outline;
    try {
        outline = runInProcess(file, 2 * fileBytes + kLeastBytes, [&](int pipe) {
            limitUse(fileBytes);
            describe(regular.c_str(), selection, name.c_str(), pipe);
        });
    } catch (std::bad_alloc const&) {
        // The process may use enough for any file that is not broken.
    }
    if (!outline)
        throw FileError(file.string() + " cannot be read: it is broken in a way that the HDF5 library cannot handle");
    return std::move(*outline);
}

void writeHdf5With(std::vector<Hdf5Object> const& objects, std::filesystem::path const& file, unsigned int compression)
{
    auto* const write = hdf5Function<decltype(modelingWriteHdf5)>("modelingWriteHdf5");
    constexpr std::uint64_t kMostBytes = 1 << 20;
    std::optional<std::string> const failure = runInProcess(file, kMostBytes, [&](int pipe) {
        try {
            write(objects, file.c_str(), compression);
        } catch (std::runtime_error const& error) {
            std::string_view const text = error.what();
            if (::write(pipe, text.data(), text.size()) < 0)
                throw;
        }
    });
    if (!failure || !failure->empty())
        throw std::runtime_error(failure.value_or("the HDF5 library fails"));
}

}
