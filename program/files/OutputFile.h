#pragma once

#include "GeometryFile.h"

#include <charconv>
#include <cstring>
#include <memory>
#include <string_view>

namespace ModelingProgram {

/// Writes a file beside its final place and moves it there when it is complete; until then, and where anything fails,
/// what was there before stays. What is no regular file (a device, a pipe) is written directly.
class OutputFile {
public:
    /// \throws FileError, as from all operations
    explicit OutputFile(std::filesystem::path const& file);
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

    /// Numbers come with the fewest digits from which the same number is read.
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

    /// The bytes of a number as they lie in memory.
    template <class T> void writeBinary(T number) { write(&number, sizeof(T)); }

    /// Completes the file and puts it in its place.
    void commit();

private:
    static constexpr std::size_t kBufferBytes = 1 << 18;

    void openBeside();
    void flush();
    void writeThrough(char const* data, std::size_t bytes);
    [[noreturn]] void fail(int error) const;

    std::filesystem::path file_; // as the caller named it
    std::filesystem::path target_; // where links lead
    std::filesystem::path temporary_; // empty while there is none
    int descriptor_ = -1;
    std::unique_ptr<char[]> buffer_;
    std::size_t used_ = 0;
};

}
