#pragma once

#include "GeometryFile.h"

#include <charconv>
#include <cstring>
#include <memory>
#include <string_view>

namespace ModelingProgram {

/// Writes a file that appears under its name when it is complete and on the disk. Until then, and if anything fails, an
/// existing file is unchanged. The file is written without a name, so that nothing remains however the process ends; on
/// file systems that have no such files it has a temporary name in the same folder. Anything but a regular file (a
/// device, a pipe) is written directly.
class OutputFile {
public:
    /// \throws FileError, as all functions do: here if the folder is not writable, or if the file exists and is to be
    ///                    kept or is write-protected
    explicit OutputFile(std::filesystem::path const& file, Existing existing = Existing::Replace);
    OutputFile(OutputFile const&) = delete;
    OutputFile& operator=(OutputFile const&) = delete;
    ~OutputFile();

    void write(void const* data, std::size_t bytes)
    {
        if (bytes > kBufferBytes - used_) {
            flush();
            if (bytes > kBufferBytes) {
                writeThrough(static_cast<char const*>(data), bytes);
                return;
            }
        }
        if (bytes != 0)
            std::memcpy(buffer_.get() + used_, data, bytes);
        used_ += bytes;
    }

    OutputFile& operator<<(std::string_view text)
    {
        write(text.data(), text.size());
        return *this;
    }

    /// Writes a number with the fewest digits from which the same number is read.
    template <class T>
    requires std::is_arithmetic_v<T> OutputFile& operator<<(T number)
    {
        constexpr std::size_t kMostDigits = 32;
        if (kBufferBytes - used_ < kMostDigits)
            flush();
        char* const first = buffer_.get() + used_;
        used_ += static_cast<std::size_t>(std::to_chars(first, first + kMostDigits, number).ptr - first);
        return *this;
    }

    /// Writes the bytes of a number as in memory.
    template <class T> void writeBinary(T number) { write(&number, sizeof(T)); }

    /// A name of the file being written, for a library that opens files by their names, in this process or a forked one.
    /// It leads to the open file, so that nothing is created again after a signal has removed it.
    /// What is written to a device or a pipe is copied from there at the end.
    std::filesystem::path temporaryFile();

    /// Completes the file and gives it its name.
    /// \throws FileError  also if a file that is to be kept has been created in the meantime
    void commit();

    /// Throws what the constructor would throw, and leaves no file behind. Pipes and devices with names are not checked.
    static void checkWritable(std::filesystem::path const& file, Existing existing);

    /// Removes a temporary file. Async-signal-safe, for handlers of signals that end the process.
    static void removeUnfinished() noexcept;

private:
    static constexpr std::size_t kBufferBytes = 1 << 18;

    void openBeside();
    void openDirectly();
    bool openUnnamed();
    template <class Create> void createTemporary(Create const& create);
    void releaseTemporary();
    void flush();
    void writeThrough(char const* data, std::size_t bytes);
    void sendCopy();
    void store() const;
    void moveIntoPlace();
    void renameTemporary() const;
    [[noreturn]] void fail(char const* why) const;
    [[noreturn]] void fail(int error) const;

    std::filesystem::path file_; // as given by the caller
    std::filesystem::path target_; // with links resolved
    std::filesystem::path temporary_; // empty if there is none
    bool isRegistered_ = false; // `removeUnfinished` knows its name
    bool isDirect_ = false; // a device or a pipe
    Existing existing_;
    int descriptor_ = -1;
    int copy_ = -1; // the temporary file of a library, if `isDirect_`
    std::unique_ptr<char[]> buffer_;
    std::size_t used_ = 0;
};

}
