#pragma once

#include "Scanner.h"

#include <functional>
#include <vector>

namespace ModelingProgram {

/// Scalars that follow one another in each record of a file and are copied to memory.
struct RecordField {
    std::size_t offset = 0; // in the record; if it comes after the list, as if the list were empty
    bool isAfterList = false;
    std::size_t scalarBytes = 0;
    std::size_t scalarCount = 1;
    std::byte* target = nullptr; // of the first record
    std::size_t stride = 0; // from the target of a record to that of the next one
};

/// Records of a file that follow one another without gaps. They have the same size, except for the values of at most
/// one list in each.
struct BinaryRecords {
    std::size_t begin = 0; // of the first record, in the file
    std::uint64_t count = 0;
    std::size_t recordBytes = 0; // without the values of the list
    unsigned int const* listOffsets = nullptr; // as those of faces: the values before each record, and all; or null
    std::size_t listScalarBytes = 0;
    bool swapsBytes = false;

    std::size_t startOf(std::uint64_t record) const
    {
        return begin + record * recordBytes + (listOffsets ? listOffsets[record] * listScalarBytes : 0);
    }
};

/// Some of the records, in memory.
struct RecordBlock {
    BinaryRecords const& records;
    std::uint64_t first;
    std::uint64_t end;
    char const* bytes; // of the first of them

    char const* at(std::uint64_t record) const { return bytes + (records.startOf(record) - records.startOf(first)); }
};

/// Reads all records in blocks and calls `visit` for each of them, from several threads, until it returns false.
/// \pre  the records are inside the file
/// \return whether all calls returned true
bool forEachBlock(
    BinaryRecords const& records, InputFile const& file, std::function<bool(RecordBlock const&)> const& visit);

/// Joins fields that follow one another in the records as well as in memory, if their bytes need not be swapped.
std::vector<RecordField> joined(std::vector<RecordField> fields, bool swapsBytes);

void copyField(RecordField const& field, RecordBlock const& block);

/// The number at an address that need not be aligned.
template <class T> T loadNumber(char const* from, bool swapsBytes)
{
    T value;
    if (swapsBytes) {
        char bytes[sizeof(T)];
        std::reverse_copy(from, from + sizeof(T), bytes);
        std::memcpy(&value, bytes, sizeof(T));
    } else {
        std::memcpy(&value, from, sizeof(T));
    }
    return value;
}

}
