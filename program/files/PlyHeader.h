#pragma once

#include "BinaryRecords.h"

#include <optional>
#include <string>
#include <type_traits>
#include <vector>

namespace ModelingProgram {

enum class PlyScalar { Char, UChar, Short, UShort, Int, UInt, Float, Double };

template <class Visit> decltype(auto) withPlyScalar(PlyScalar scalar, Visit&& visit)
{
    switch (scalar) {
    case PlyScalar::Char:
        return visit(std::type_identity<signed char>());
    case PlyScalar::UChar:
        return visit(std::type_identity<unsigned char>());
    case PlyScalar::Short:
        return visit(std::type_identity<short>());
    case PlyScalar::UShort:
        return visit(std::type_identity<unsigned short>());
    case PlyScalar::Int:
        return visit(std::type_identity<int>());
    case PlyScalar::UInt:
        return visit(std::type_identity<unsigned int>());
    case PlyScalar::Float:
        return visit(std::type_identity<float>());
    case PlyScalar::Double:
        break;
    }
    return visit(std::type_identity<double>());
}

inline std::size_t sizeOf(PlyScalar scalar)
{
    return withPlyScalar(scalar, []<class T>(std::type_identity<T>) { return sizeof(T); });
}

inline bool isWhole(PlyScalar scalar)
{
    return scalar != PlyScalar::Float && scalar != PlyScalar::Double;
}

/// Lists of the same length, one in each record of a file.
struct PlyEqualLists {
    unsigned int length = 0;
    std::size_t offset = 0; // of the values, in a record
    BinaryRecords records;
};

/// A property of the elements in a file.
struct PlyProperty {
    std::string name;
    PlyScalar type = PlyScalar::Int;
    std::optional<PlyScalar> lengthType; // of a list

    // Where the values are stored.
    enum class Use { Nothing, Position, Value, Indices, List } use = Use::Nothing;
    int axis = 0; // of a position
    std::byte* target = nullptr; // of the next value
    std::size_t stride = 0;
    Orvan::Array<unsigned int> lengths; // of lists; one entry per element
    Orvan::Array<std::byte> values; // of all lists
    std::optional<PlyEqualLists> equalLists; // instead of the two, if they are read later
};

/// Elements of one kind; in a binary file they are records.
struct PlyElement {
    std::string name;
    std::uint64_t count;
    std::vector<PlyProperty> properties;
};

enum class PlyEncoding { Text, LittleEndian, BigEndian };

struct PlyHeader {
    PlyEncoding encoding = PlyEncoding::Text;
    std::vector<PlyElement> elements;
    std::vector<std::string> textureFiles; // that comments name
};

/// Reads the lines up to "end_header". The scanner is then at the first element.
/// \throws FileError  also if the file is too short for the elements
PlyHeader readPlyHeader(TextScanner& scanner);

}
