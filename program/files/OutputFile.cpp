#include "OutputFile.h"

#include "WorkMeter.h"

#include <atomic>
#include <cerrno>
#include <cstdio>
#include <fcntl.h>
#include <linux/limits.h>
#include <sys/stat.h>
#include <unistd.h>

namespace ModelingProgram {

namespace {

    constexpr mode_t kReadAndWriteForAll = 0666; // minus the umask

    /// The end of a chain of symbolic links, so that the file is replaced rather than the link.
    std::filesystem::path followLinks(std::filesystem::path file)
    {
        constexpr int kMostLinks = 40;
        std::error_code error;
        for (int i = 0; i < kMostLinks && std::filesystem::is_symlink(file, error); ++i) {
            std::filesystem::path const link = std::filesystem::read_symlink(file, error);
            if (error)
                break;
            file = file.parent_path() / link;
        }
        return file;
    }

    /// Renaming could replace such a file, but its permissions say that it is to be kept.
    bool isWriteProtected(std::filesystem::path const& file, std::filesystem::perms permissions)
    {
        using std::filesystem::perms;
        constexpr perms kWrite = perms::owner_write | perms::group_write | perms::others_write;
        return (permissions & kWrite) == perms::none || ::faccessat(AT_FDCWD, file.c_str(), W_OK, AT_EACCESS) != 0;
    }

    /// The name of the temporary file of one `OutputFile`, since the program writes one file at a time. Static, because
    /// a signal handler may read it at any moment.
    struct Unfinished {
        std::atomic<bool> isTaken = false;
        std::atomic<bool> hasName = false;
        char name[PATH_MAX] = {};

        bool take(std::filesystem::path const& file)
        {
            if (file.native().size() >= sizeof(name) || isTaken.exchange(true))
                return false;
            std::strcpy(name, file.c_str());
            hasName = true;
            return true;
        }

        void release()
        {
            hasName = false;
            isTaken = false;
        }
    };

    constinit Unfinished unfinished;

}

OutputFile::OutputFile(std::filesystem::path const& file, Existing existing)
    : file_(file)
    , target_(followLinks(file))
    , existing_(existing)
    , buffer_(std::make_unique_for_overwrite<char[]>(kBufferBytes))
{
    std::error_code error;
    std::filesystem::file_status const status = std::filesystem::status(target_, error);
    if (std::filesystem::is_directory(status))
        fail(EISDIR);
    bool const isRegular = std::filesystem::is_regular_file(status);
    if (isRegular && existing == Existing::Keep)
        fail(EEXIST);
    if (isRegular && isWriteProtected(target_, status.permissions()))
        fail("it is write-protected");
    if (isRegular || !std::filesystem::exists(status))
        openBeside();
    else if ((descriptor_ = ::open(target_.c_str(), O_WRONLY | O_CLOEXEC)) < 0)
        fail(errno);
    if (isRegular) // the new file gets the permissions of the old one
        static_cast<void>(::fchmod(descriptor_, static_cast<mode_t>(status.permissions())));
}

OutputFile::~OutputFile()
{
    if (descriptor_ >= 0)
        ::close(descriptor_);
    if (!temporary_.empty())
        ::unlink(temporary_.c_str());
    releaseTemporary();
}

void OutputFile::openBeside()
{
    static std::atomic<unsigned int> counter = 0;
    do {
        releaseTemporary();
        temporary_ = target_.parent_path()
            / (".modeling-" + std::to_string(::getpid()) + "-" + std::to_string(counter.fetch_add(1)) + ".tmp");
        isRegistered_ = unfinished.take(temporary_); // before the file exists, because a signal may arrive in between
        descriptor_ = ::open(temporary_.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, kReadAndWriteForAll);
    } while (descriptor_ < 0 && errno == EEXIST);
    if (descriptor_ < 0) {
        int const error = errno;
        releaseTemporary();
        fail(error);
    }
}

void OutputFile::releaseTemporary()
{
    temporary_.clear();
    if (std::exchange(isRegistered_, false))
        unfinished.release();
}

void OutputFile::flush()
{
    std::size_t const bytes = std::exchange(used_, 0);
    writeThrough(buffer_.get(), bytes);
}

void OutputFile::writeThrough(char const* data, std::size_t bytes)
{
    while (bytes != 0) {
        ssize_t const written = ::write(descriptor_, data, bytes);
        if (written < 0 && errno == EINTR)
            continue;
        if (written < 0)
            fail(errno);
        data += written;
        bytes -= static_cast<std::size_t>(written);
        workMeter.add(static_cast<std::uint64_t>(written));
    }
}

std::filesystem::path OutputFile::temporaryFile() const
{
    if (temporary_.empty())
        fail("this format needs a regular file, not a device or a pipe");
    return "/proc/self/fd/" + std::to_string(descriptor_);
}

void OutputFile::commit()
{
    flush();
    if (::close(std::exchange(descriptor_, -1)) != 0)
        fail(errno);
    if (temporary_.empty())
        return;
    moveIntoPlace();
    releaseTemporary();
}

void OutputFile::moveIntoPlace() const
{
    if (existing_ == Existing::Keep) {
        if (::renameat2(AT_FDCWD, temporary_.c_str(), AT_FDCWD, target_.c_str(), RENAME_NOREPLACE) == 0)
            return;
        bool const isUnknown = errno == EINVAL || errno == ENOSYS; // not supported by some file systems
        if (!isUnknown || ::access(target_.c_str(), F_OK) == 0)
            fail(isUnknown ? EEXIST : errno);
    }
    if (::rename(temporary_.c_str(), target_.c_str()) != 0)
        fail(errno);
}

void OutputFile::checkWritable(std::filesystem::path const& file, Existing existing)
{
    std::error_code error;
    std::filesystem::file_status const status = std::filesystem::status(file, error);
    bool const isSpecial = std::filesystem::exists(status) && !std::filesystem::is_regular_file(status)
        && !std::filesystem::is_directory(status);
    if (!isSpecial) // opening and closing a pipe would be the end of file for its reader
        OutputFile(file, existing);
}

void OutputFile::removeUnfinished() noexcept
{
    if (unfinished.hasName)
        ::unlink(unfinished.name);
}

void OutputFile::fail(char const* why) const
{
    throw FileError(file_.string() + " cannot be written: " + why);
}

}
