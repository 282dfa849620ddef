#pragma once

#include "OutputFile.h"

#include <functional>

namespace ModelingProgram {

/// A part of a file in memory, which grows as it is written to.
class OutputBuffer {
public:
    OutputBuffer() = default;

    /// Room for bytes that the caller then writes.
    char* extend(std::size_t bytes)
    {
        reserve(bytes);
        return std::exchange(end_, end_ + bytes);
    }

    void write(void const* data, std::size_t bytes)
    {
        if (bytes != 0)
            std::memcpy(extend(bytes), data, bytes);
    }

    OutputBuffer& operator<<(std::string_view text)
    {
        write(text.data(), text.size());
        return *this;
    }

    /// As in `OutputFile`.
    template <class T>
    requires std::is_arithmetic_v<T> OutputBuffer& operator<<(T number)
    {
        constexpr std::size_t kMostDigits = 32;
        reserve(kMostDigits);
        end_ = std::to_chars(end_, end_ + kMostDigits, number).ptr;
        return *this;
    }

    std::string_view text() const { return {bytes_.get(), size()}; }
    std::size_t size() const { return static_cast<std::size_t>(end_ - bytes_.get()); }
    /// Keeps the memory.
    void clear() { end_ = bytes_.get(); }

private:
    void reserve(std::size_t bytes)
    {
        if (bytes > capacity_ - size())
            grow(bytes);
    }
    void grow(std::size_t bytes);

    std::unique_ptr<char[]> bytes_;
    std::size_t capacity_ = 0;
    char* end_ = nullptr;
};

/// Writes elements in blocks, which are filled in parallel while earlier ones are written. The file does not depend on
/// the number of threads.
/// \param bytesEach  approximate bytes per element in the file
/// \param fill       appends the elements from `first` up to `end`; called from several threads
void writeInBlocks(std::uint64_t count, std::size_t bytesEach,
    std::function<void(std::uint64_t first, std::uint64_t end, OutputBuffer&)> const& fill, OutputFile& out);

}
