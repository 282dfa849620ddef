#include "OutputFile.h"

#include "Streams.h"
#include "WorkMeter.h"

#include <atomic>
#include <cerrno>
#include <cstdio>
#include <fcntl.h>
#include <linux/limits.h>
#include <poll.h>
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

    std::filesystem::path folderOf(std::filesystem::path const& file)
    {
        return file.has_parent_path() ? file.parent_path() : ".";
    }

    /// Renaming could replace such a file, but its permissions say that it is to be kept. They say so to the superuser
    /// too, who could write it: nobody removes the write permission of a file without a purpose.
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
    isDirect_ = isStream(file);
    if (isDirect_) {
        openDirectly();
        return;
    }
    std::error_code error;
    std::filesystem::file_status const status = std::filesystem::status(target_, error);
    if (std::filesystem::is_directory(status))
        fail(EISDIR);
    bool const isRegular = std::filesystem::is_regular_file(status);
    if (isRegular && existing == Existing::Keep)
        fail(EEXIST);
    if (isRegular && isWriteProtected(target_, status.permissions()))
        fail("it is write-protected");
    openBeside();
    if (isRegular) // the new file gets the permissions of the old one
        static_cast<void>(::fchmod(descriptor_, static_cast<mode_t>(status.permissions())));
}

OutputFile::~OutputFile()
{
    if (descriptor_ >= 0)
        ::close(descriptor_);
    if (copy_ >= 0)
        ::close(copy_);
    if (!temporary_.empty())
        ::unlink(temporary_.c_str());
    releaseTemporary();
}

void OutputFile::openDirectly()
{
    if ((descriptor_ = openForWriting(file_)) < 0)
        fail(errno);
    if ((::fcntl(descriptor_, F_GETFL) & O_ACCMODE) == O_RDONLY) // such as a closed standard output
        fail(EBADF);
}

void OutputFile::openBeside()
{
    if (openUnnamed())
        return;
    createTemporary([this] {
        descriptor_ = ::open(temporary_.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, kReadAndWriteForAll);
        return descriptor_ >= 0;
    });
}

/// Some file systems have no files without names, and without /proc none could get a name.
bool OutputFile::openUnnamed()
{
    descriptor_ = ::open(folderOf(target_).c_str(), O_WRONLY | O_TMPFILE | O_CLOEXEC, kReadAndWriteForAll);
    if (descriptor_ >= 0 && ::access(nameOfDescriptor(descriptor_).c_str(), F_OK) != 0)
        ::close(std::exchange(descriptor_, -1));
    return descriptor_ >= 0;
}

/// Calls a function that creates a file of the name `temporary_`, with a name that does not exist yet.
template <class Create> void OutputFile::createTemporary(Create const& create)
{
    static std::atomic<unsigned int> counter = 0;
    bool isCreated = false;
    do {
        releaseTemporary();
        temporary_ = target_.parent_path()
            / (".modeling-" + std::to_string(::getpid()) + "-" + std::to_string(counter.fetch_add(1)) + ".tmp");
        isRegistered_ = unfinished.take(temporary_); // before the file exists, because a signal may arrive in between
        isCreated = create();
    } while (!isCreated && errno == EEXIST);
    if (!isCreated) {
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
        if (written < 0 && errno == EAGAIN) { // another program made the stream return at once
            pollfd waiting{descriptor_, POLLOUT, 0};
            ::poll(&waiting, 1, -1);
        }
        if (written < 0 && (errno == EINTR || errno == EAGAIN))
            continue;
        if (written < 0)
            fail(errno);
        data += written;
        bytes -= static_cast<std::size_t>(written);
        workMeter.add(static_cast<std::uint64_t>(written));
    }
}

std::filesystem::path OutputFile::temporaryFile()
{
    if (isDirect_ && copy_ < 0 && (copy_ = openTemporary()) < 0)
        fail(errno);
    return nameOfDescriptor(isDirect_ ? copy_ : descriptor_);
}

void OutputFile::commit()
{
    flush();
    if (isDirect_) {
        sendCopy();
    } else {
        store();
        moveIntoPlace();
    }
    if (::close(std::exchange(descriptor_, -1)) != 0 && isDirect_)
        fail(errno);
}

/// Writes what a library has written to the temporary file.
void OutputFile::sendCopy()
{
    ssize_t count = 0;
    for (off_t at = 0; copy_ >= 0 && (count = ::pread(copy_, buffer_.get(), kBufferBytes, at)) > 0; at += count)
        writeThrough(buffer_.get(), static_cast<std::size_t>(count));
    if (count < 0)
        fail(errno);
}

/// Waits until the content is on the disk, so that a crash of the machine does not leave an empty file under the name.
void OutputFile::store() const
{
    if (::fsync(descriptor_) != 0 && errno != EINVAL && errno != ENOSYS) // not supported by some file systems
        fail(errno);
}

void OutputFile::moveIntoPlace()
{
    auto const link = [this](std::filesystem::path const& name) {
        return ::linkat(AT_FDCWD, nameOfDescriptor(descriptor_).c_str(), AT_FDCWD, name.c_str(), AT_SYMLINK_FOLLOW)
            == 0;
    };
    bool const isUnnamed = temporary_.empty();
    if (!isUnnamed || !link(target_)) {
        if (isUnnamed && (errno != EEXIST || existing_ == Existing::Keep))
            fail(errno);
        if (isUnnamed) // a link cannot replace a file, but a file with a name can be renamed
            createTemporary([&] { return link(temporary_); });
        renameTemporary();
        releaseTemporary();
    }
    int const folder = ::open(folderOf(target_).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (folder >= 0) {
        static_cast<void>(::fsync(folder)); // the file is there, whether or not its name can be waited for
        ::close(folder);
    }
}

void OutputFile::renameTemporary() const
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
    if (!isStream(file) || descriptorOf(file)) // opening and closing a pipe would be the end of file for its reader
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

void OutputFile::fail(int error) const
{
    fail(error == EPIPE ? "the program that reads it has ended" : std::strerror(error));
}

}
