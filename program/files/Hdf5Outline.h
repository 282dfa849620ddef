#pragma once

#include "Hdf5File.h"

#include <TessaraGeometry/ElementTypes.h>

#include <cstdint>
#include <cstring>
#include <stdexcept>
#include <string>
#include <string_view>
#include <type_traits>
#include <vector>

namespace ModelingProgram {

// The outline of an HDF5 file: its structure, and where the values of its arrays are. It is a sequence of records, each
// a kind, a name, and what the comments below list. Numbers are as in memory, texts have their length before them.

enum class Hdf5Record : unsigned char {
    Object, // number of the value, kind of the group (text), remark (text); then its values, and `End`
    End,
    Again, // number of a value that is reached by another path too
    Nothing, // no value
    NullObject,
    Scalar, // element type, bytes (text)
    NullArray, // number of the value, element type
    InlineArray, // number of the value, element type, length, bytes (text)
    ContiguousArray, // number of the value, element type, length, address
    ChunkedArray, // number of the value, element type, length, `Hdf5Chunks`
    Refusal // why (text); the name is the path of the value
};

/// Element types are numbered as `forEachElementTypeName` visits them. One more type is held by scalars only.
inline constexpr unsigned int kInterpolationType = 40;

/// Calls `visit(ElementType<T>)` for the type with this number. Returns false if there is none.
template <class Visit> bool visitElementType(std::uint64_t number, Visit&& visit)
{
    std::uint64_t index = 0;
    bool found = false;
    Tessara::Geometry::forEachElementTypeName([&]<class T>(Tessara::Geometry::ElementType<T> type) {
        if (index++ == number) {
            found = true;
            visit(type);
        }
    });
    return found;
}

template <class T> unsigned int elementTypeNumber()
{
    unsigned int index = 0, result = 0;
    Tessara::Geometry::forEachElementTypeName([&]<class U>(Tessara::Geometry::ElementType<U>) {
        if constexpr (std::is_same_v<T, U>)
            result = index;
        ++index;
    });
    return result;
}

/// Types whose arrays are groups of several arrays.
template <class T> inline constexpr bool kIsComposed =
    std::is_same_v<T, Orvan::String> || std::is_same_v<T, Tessara::Geometry::Common::GeoLocation>;

// The attribute of the root that says that the file has the layout of docs/file-layout.md, and its value.
inline constexpr char const* kLayoutAttribute = "modeling_layout";
inline constexpr int kLayoutVersion = 1;

// Kinds of groups that are not objects, as the attribute "kind" names them.
inline constexpr char const* kStrings = "strings";
inline constexpr char const* kLocation = "location";
inline constexpr char const* kLocations = "locations";

/// How an array is stored in chunks. Those in the order of their coordinates, the last one fastest.
struct Hdf5Chunks {
    enum Filter : unsigned int { Deflate = 1, Shuffle = 2 }; // as HDF5 numbers them

    struct Chunk {
        std::uint64_t address;
        std::uint64_t bytes; // as stored
        std::uint64_t skipped; // one bit per filter that was not applied
    };

    std::vector<std::uint64_t> extents; // of the array, in scalars: those of an element come after its length
    std::vector<std::uint64_t> chunkExtents;
    std::vector<std::uint64_t> filters; // in the order of writing
    std::vector<Chunk> chunks;
};

class Hdf5OutlineWriter {
public:
    explicit Hdf5OutlineWriter(int descriptor)
        : descriptor_(descriptor)
    {
    }

    void begin(Hdf5Record kind, std::string_view name)
    {
        bytes_ += static_cast<char>(kind);
        text(name);
    }
    void number(std::uint64_t value) { bytes_.append(reinterpret_cast<char const*>(&value), sizeof(value)); }
    void numbers(std::vector<std::uint64_t> const& values)
    {
        number(values.size());
        for (std::uint64_t const value : values)
            number(value);
    }
    void chunks(Hdf5Chunks const& chunks)
    {
        numbers(chunks.extents);
        numbers(chunks.chunkExtents);
        numbers(chunks.filters);
        number(chunks.chunks.size());
        for (auto const& [address, bytes, skipped] : chunks.chunks)
            for (std::uint64_t const value : {address, bytes, skipped})
                number(value);
    }
    void text(std::string_view value)
    {
        number(value.size());
        bytes_ += value;
        if (bytes_.size() > kBufferBytes)
            flush();
    }
    /// \throws std::runtime_error  if the reader has closed the pipe
    void flush();

private:
    static constexpr std::size_t kBufferBytes = 1 << 16;

    int descriptor_;
    std::string bytes_;
};

/// An outline that makes no sense, which a library that reads a broken file may produce.
class Hdf5OutlineError : public std::runtime_error {
public:
    Hdf5OutlineError()
        : std::runtime_error("the HDF5 library reads nonsense from it")
    {
    }
};

class Hdf5OutlineReader {
public:
    explicit Hdf5OutlineReader(std::string_view bytes)
        : bytes_(bytes)
    {
    }

    bool atEnd() const { return bytes_.empty(); }

    Hdf5Record kind()
    {
        auto const kind = static_cast<unsigned char>(take(1)[0]);
        if (kind > static_cast<unsigned char>(Hdf5Record::Refusal))
            throw Hdf5OutlineError();
        return static_cast<Hdf5Record>(kind);
    }
    std::uint64_t number()
    {
        std::uint64_t value;
        std::memcpy(&value, take(sizeof(value)).data(), sizeof(value));
        return value;
    }
    std::vector<std::uint64_t> numbers()
    {
        std::uint64_t const count = number();
        if (count > bytes_.size() / sizeof(std::uint64_t))
            throw Hdf5OutlineError();
        std::vector<std::uint64_t> values(count);
        for (std::uint64_t& value : values)
            value = number();
        return values;
    }
    Hdf5Chunks chunks()
    {
        Hdf5Chunks result;
        for (auto* const part : {&result.extents, &result.chunkExtents, &result.filters})
            *part = numbers();
        std::uint64_t const count = number();
        if (count > bytes_.size() / sizeof(Hdf5Chunks::Chunk))
            throw Hdf5OutlineError();
        result.chunks.resize(count);
        for (Hdf5Chunks::Chunk& chunk : result.chunks)
            for (std::uint64_t* const value : {&chunk.address, &chunk.bytes, &chunk.skipped})
                *value = number();
        return result;
    }
    std::string_view text() { return take(number()); }

private:
    std::string_view take(std::uint64_t count)
    {
        if (count > bytes_.size())
            throw Hdf5OutlineError();
        std::string_view const result = bytes_.substr(0, count);
        bytes_.remove_prefix(count);
        return result;
    }

    std::string_view bytes_;
};

}
