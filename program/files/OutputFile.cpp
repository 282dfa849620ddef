#include "OutputFile.h"

#include <atomic>
#include <cerrno>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace ModelingProgram {

namespace {

    constexpr mode_t kReadAndWriteForAll = 0666; // less what the process masks

    /// Where the file will lie: the end of a chain of links, so that a link stays one.
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

}

OutputFile::OutputFile(std::filesystem::path const& file)
    : file_(file)
    , target_(followLinks(file))
    , buffer_(std::make_unique_for_overwrite<char[]>(kBufferBytes))
{
    std::error_code error;
    std::filesystem::file_status const status = std::filesystem::status(target_, error);
    if (std::filesystem::is_directory(status))
        fail(EISDIR);
    if (!std::filesystem::exists(status) || std::filesystem::is_regular_file(status))
        openBeside();
    else
        descriptor_ = ::open(target_.c_str(), O_WRONLY | O_CLOEXEC);
    if (descriptor_ < 0)
        fail(errno);
    if (std::filesystem::is_regular_file(status)) // the new file is open to whom the old one was
        static_cast<void>(::fchmod(descriptor_, static_cast<mode_t>(status.permissions())));
}

OutputFile::~OutputFile()
{
    if (descriptor_ >= 0)
        ::close(descriptor_);
    if (!temporary_.empty())
        ::unlink(temporary_.c_str());
}

void OutputFile::openBeside()
{
    static std::atomic<unsigned int> counter = 0;
    do {
        temporary_ = target_.parent_path()
            / (".modeling-" + std::to_string(::getpid()) + "-" + std::to_string(counter.fetch_add(1)) + ".tmp");
        descriptor_ = ::open(temporary_.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, kReadAndWriteForAll);
    } while (descriptor_ < 0 && errno == EEXIST);
    if (descriptor_ < 0)
        temporary_.clear(); // leaves errno alone
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
    }
}

void OutputFile::commit()
{
    flush();
    if (::close(std::exchange(descriptor_, -1)) != 0)
        fail(errno);
    if (temporary_.empty())
        return;
    if (::rename(temporary_.c_str(), target_.c_str()) != 0)
        fail(errno);
    temporary_.clear();
}

void OutputFile::fail(int error) const
{
    throw FileError(file_.string() + " cannot be written: " + std::strerror(error));
}

}
