#include "BinaryRecords.h"

#include "WorkMeter.h"
#include "copyStrided.h"

#include "frame/ParallelFor.h"

#include <atomic>

namespace ModelingProgram {

namespace {

    constexpr std::size_t kRecordBlockBytes = std::size_t{1} << 18; // fits the second-level cache

    /// Reverses the order of `Bytes` bytes in each record. The size is a constant so that this is a few instructions.
    template <std::size_t Bytes>
    void swapPieces(char const* from, std::size_t fromStride, std::byte* to, std::size_t toStride, std::uint64_t count)
    {
        for (; count != 0; --count, from += fromStride, to += toStride)
            std::reverse_copy(from, from + Bytes, reinterpret_cast<char*>(to));
    }

    void swapStrided(char const* from, std::size_t fromStride, std::size_t bytes, std::byte* to, std::size_t toStride,
        std::uint64_t count)
    {
        auto const swap = bytes == 2 ? swapPieces<2> : bytes == 4 ? swapPieces<4> : swapPieces<8>;
        swap(from, fromStride, to, toStride, count);
    }

    void copyOne(RecordField const& field, bool swapsBytes, char const* from, std::byte* to)
    {
        if (!swapsBytes || field.scalarBytes == 1)
            std::memcpy(to, from, field.scalarBytes * field.scalarCount);
        else
            swapStrided(from, field.scalarBytes, field.scalarBytes, to, field.scalarBytes, field.scalarCount);
    }

}

bool forEachBlock(
    BinaryRecords const& records, InputFile const& file, std::function<bool(RecordBlock const&)> const& visit)
{
    if (records.count == 0)
        return true;
    std::uint64_t const meanBytes = (records.startOf(records.count) - records.begin) / records.count;
    std::uint64_t const blockSize =
        std::max<std::uint64_t>(1, kRecordBlockBytes / std::max<std::uint64_t>(1, meanBytes));
    std::atomic<bool> isStopped = false;
    auto const visitBlocks = [&](tbb::blocked_range<std::uint64_t> const& blocks) {
        std::unique_ptr<char[]> buffer;
        std::size_t capacity = 0;
        for (std::uint64_t block = blocks.begin(); block != blocks.end() && !isStopped; ++block) {
            std::uint64_t const first = block * blockSize, end = std::min(records.count, first + blockSize);
            std::size_t const start = records.startOf(first), bytes = records.startOf(end) - start;
            char const* loaded = file.loadedBytes(start, bytes);
            workMeter.add(loaded ? bytes / 2 : bytes); // loading counted the other half
            if (!loaded) {
                if (bytes > capacity)
                    buffer = std::make_unique_for_overwrite<char[]>(capacity = bytes);
                file.read(start, bytes, buffer.get());
                loaded = buffer.get();
            }
            if (!visit({records, first, end, loaded}))
                isStopped = true;
        }
    };
    // Each block has records of its own, and `visit` stores them at places of their own.
    std::uint64_t const blockCount = (records.count + blockSize - 1) / blockSize;
    Modeling::parallelFor(tbb::blocked_range<std::uint64_t>(0, blockCount, Modeling::kCoarseGrain), visitBlocks);
    return !isStopped;
}

std::vector<RecordField> joined(std::vector<RecordField> fields, bool swapsBytes)
{
    std::vector<RecordField> result;
    for (RecordField field : fields) {
        if (!swapsBytes)
            field = {
                field.offset, field.isAfterList, 1, field.scalarBytes * field.scalarCount, field.target, field.stride};
        bool const isNext = !swapsBytes && !result.empty() && result.back().isAfterList == field.isAfterList
            && result.back().offset + result.back().scalarCount == field.offset
            && result.back().target + result.back().scalarCount == field.target && result.back().stride == field.stride;
        if (isNext)
            result.back().scalarCount += field.scalarCount;
        else
            result.push_back(field);
    }
    return result;
}

void copyField(RecordField const& field, RecordBlock const& block)
{
    BinaryRecords const& records = block.records;
    std::byte* const to = field.target + block.first * field.stride;
    std::size_t const bytes = field.scalarBytes * field.scalarCount;
    std::uint64_t const count = block.end - block.first;
    bool const swaps = records.swapsBytes && field.scalarBytes != 1;
    if (!records.listOffsets) {
        char const* const from = block.bytes + field.offset;
        if (!swaps)
            copyStrided(from, records.recordBytes, bytes, to, field.stride, count);
        else if (field.scalarCount == 1)
            swapStrided(from, records.recordBytes, bytes, to, field.stride, count);
        else
            for (std::uint64_t i = 0; i != count; ++i)
                copyOne(field, swaps, from + i * records.recordBytes, to + i * field.stride);
        return;
    }
    for (std::uint64_t i = 0; i != count; ++i) {
        std::uint64_t const record = block.first + i;
        std::size_t const list = field.isAfterList
            ? (records.listOffsets[record + 1] - records.listOffsets[record]) * records.listScalarBytes
            : 0;
        copyOne(field, swaps, block.at(record) + field.offset + list, to + i * field.stride);
    }
}

}
