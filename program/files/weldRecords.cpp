#include "weldRecords.h"

#include "Vectors.h"
#include "Welder.h"
#include "WorkMeter.h"

#include "frame/Arrays.h"

#include <atomic>
#include <bit>

namespace ModelingProgram {

using Tessara::Math::float3;

namespace {

    constexpr unsigned int kCornersEach = 3; // of a record
    constexpr unsigned int kNoCorner = 0xFFFFFFFF;

    struct WeldedCorner {
        float3 position;
        unsigned int number;
    };

    /// Distributes the corners of a file into parts, so that equal positions are in the same part.
    class RecordWelder {
    public:
        RecordWelder(BinaryRecords const& records, std::size_t offset, InputFile const& file)
            : records_(records)
            , offset_(offset)
            , file_(file)
            , cornerCount_(kCornersEach * records.count)
            , partBits_(static_cast<int>(std::bit_width(cornerCount_ / kCornersPerPart)))
            , runSize_(std::max<std::uint64_t>(kLeastRunSize, records.count / kMostRuns + 1))
        {
        }

        std::optional<WeldedPoints> weld()
        {
            if (!countParts())
                return std::nullopt;
            if (!distribute())
                file_.refuseChanged();
            findFirstCorners();
            return numberPoints();
        }

    private:
        static constexpr std::uint64_t kCornersPerPart = 1 << 15; // whose table fits the second-level cache
        static constexpr std::uint64_t kLeastRunSize = 1 << 14;
        static constexpr std::uint64_t kMostRuns = 256;

        std::size_t partCount() const { return std::size_t{1} << partBits_; }
        std::uint64_t runCount() const { return (records_.count + runSize_ - 1) / runSize_; }

        std::size_t partOf(std::uint64_t hash) const { return partBits_ == 0 ? 0 : hash >> (64 - partBits_); }

        /// Calls `visit(corner, position)` for the corners of a run of records in ascending order. Runs are visited in
        /// parallel. \return false if the `visit` of a run returned false, which ends the run
        template <class Visit> bool visitRuns(Visit const& makeVisit) const
        {
            std::atomic<bool> isDone = true;
            // Each run has corners of its own.
            Modeling::parallelFor(tbb::blocked_range<std::uint64_t>(0, runCount(), Modeling::kCoarseGrain),
                [&](tbb::blocked_range<std::uint64_t> const& runs) {
                    for (std::uint64_t run = runs.begin(); run != runs.end(); ++run)
                        if (!visitRun(run, makeVisit(run)))
                            isDone = false;
                });
            return isDone;
        }

        template <class Visit> bool visitRun(std::uint64_t run, Visit visit) const
        {
            constexpr std::uint64_t kRecordsAtOnce = 1 << 12;
            std::uint64_t const end = std::min(records_.count, (run + 1) * runSize_);
            auto const buffer = std::make_unique_for_overwrite<char[]>(kRecordsAtOnce * records_.recordBytes);
            for (std::uint64_t first = run * runSize_; first < end; first += kRecordsAtOnce) {
                std::uint64_t const count = std::min(kRecordsAtOnce, end - first);
                std::size_t const start = records_.startOf(first), bytes = count * records_.recordBytes;
                char const* at = file_.loadedBytes(start, bytes);
                workMeter.add(bytes / 2); // the records are visited twice
                if (!at) {
                    file_.read(start, bytes, buffer.get());
                    at = buffer.get();
                }
                for (std::uint64_t i = 0; i != count; ++i, at += records_.recordBytes)
                    for (unsigned int corner = 0; corner != kCornersEach; ++corner)
                        if (!visit(static_cast<unsigned int>(kCornersEach * (first + i) + corner),
                                positionAt(at + offset_ + corner * sizeof(float3))))
                            return false;
            }
            return true;
        }

        float3 positionAt(char const* at) const
        {
            bool const swaps = records_.swapsBytes;
            return {loadNumber<float>(at, swaps), loadNumber<float>(at + sizeof(float), swaps),
                loadNumber<float>(at + 2 * sizeof(float), swaps)};
        }

        /// \return whether all positions are finite
        bool countParts()
        {
            runParts_.assign(runCount() * partCount(), 0);
            bool const areFinite = visitRuns([&](std::uint64_t run) {
                return [this, counts = runParts_.data() + run * partCount()](unsigned int, float3 const& position) {
                    ++counts[partOf(hashOf(position))];
                    return isFinite(position);
                };
            });
            partOffsets_.assign(partCount() + 1, 0);
            std::uint64_t total = 0;
            for (std::size_t part = 0; part != partCount(); ++part) {
                partOffsets_[part] = total;
                for (std::uint64_t run = 0; run != runCount(); ++run)
                    total += std::exchange(runParts_[run * partCount() + part], total);
            }
            partOffsets_[partCount()] = total;
            return areFinite;
        }

        /// \return false if the file no longer has the corners that were counted
        bool distribute()
        {
            corners_ = Modeling::uninitializedArray<WeldedCorner>(cornerCount_);
            return visitRuns([&](std::uint64_t run) {
                auto const begin = runParts_.begin() + static_cast<std::ptrdiff_t>(run * partCount());
                auto const count = static_cast<std::ptrdiff_t>(partCount());
                auto const end = run + 1 == runCount() ? partOffsets_.begin() + 1 : begin + count;
                return [this, next = std::vector(begin, begin + count), end](
                           unsigned int corner, float3 const& position) mutable {
                    std::size_t const part = partOf(hashOf(position));
                    if (next[part] == end[static_cast<std::ptrdiff_t>(part)])
                        return false;
                    corners_[next[part]++] = {position, corner};
                    return true;
                };
            });
        }

        /// Finds the first of the corners that are equal to each corner.
        void findFirstCorners()
        {
            firsts_ = Modeling::uninitializedArray<unsigned int>(cornerCount_);
            // Each part has corners of its own.
            Modeling::parallelFor(tbb::blocked_range<std::size_t>(0, partCount(), Modeling::kCoarseGrain),
                [&](tbb::blocked_range<std::size_t> const& parts) {
                    std::vector<unsigned int> table;
                    for (std::size_t part = parts.begin(); part != parts.end(); ++part)
                        findFirstCornersIn(part, table);
                });
        }

        /// The table has open addressing; at most half of it is used.
        void findFirstCornersIn(std::size_t part, std::vector<unsigned int>& table)
        {
            WeldedCorner const* const corners = corners_.data + partOffsets_[part];
            std::uint64_t const count = partOffsets_[part + 1] - partOffsets_[part];
            std::uint64_t const mask = std::bit_ceil(2 * count + 1) - 1;
            table.assign(mask + 1, kNoCorner);
            for (std::uint64_t i = 0; i != count; ++i) {
                std::uint64_t slot = hashOf(corners[i].position) & mask;
                while (table[slot] != kNoCorner && !(corners[table[slot]].position == corners[i].position))
                    slot = (slot + 1) & mask;
                if (table[slot] == kNoCorner)
                    table[slot] = static_cast<unsigned int>(i);
                firsts_[corners[i].number] = corners[table[slot]].number;
            }
        }

        WeldedPoints numberPoints()
        {
            corners_ = {};
            std::vector<std::uint64_t> next(runCount() + 1, 0); // number of the first new point of each run
            auto const forEachRun = [&](auto const& visit) {
                // Each run has corners of its own.
                Modeling::parallelFor(tbb::blocked_range<std::uint64_t>(0, runCount(), Modeling::kCoarseGrain),
                    [&](tbb::blocked_range<std::uint64_t> const& runs) {
                        for (std::uint64_t run = runs.begin(); run != runs.end(); ++run)
                            visit(run, kCornersEach * run * runSize_,
                                kCornersEach * std::min(records_.count, (run + 1) * runSize_));
                    });
            };
            forEachRun([&](std::uint64_t run, std::uint64_t begin, std::uint64_t end) {
                std::uint64_t newCount = 0;
                for (std::uint64_t corner = begin; corner != end; ++corner)
                    newCount += firsts_[corner] == corner;
                next[run + 1] = newCount;
            });
            for (std::uint64_t run = 0; run != runCount(); ++run)
                next[run + 1] += next[run];
            WeldedPoints result{Modeling::uninitializedArray<float3>(next[runCount()]),
                Modeling::uninitializedArray<unsigned int>(cornerCount_)};
            bool const areFinite = visitRuns([&](std::uint64_t run) {
                return [this, &result, point = next[run]](unsigned int corner, float3 const& position) mutable {
                    if (firsts_[corner] == corner) {
                        result.numbers[corner] = static_cast<unsigned int>(point);
                        result.positions[point++] = position;
                    }
                    return isFinite(position);
                };
            });
            if (!areFinite)
                file_.refuseChanged();
            forEachRun([&](std::uint64_t, std::uint64_t begin, std::uint64_t end) {
                for (std::uint64_t corner = begin; corner != end; ++corner)
                    if (firsts_[corner] != corner)
                        result.numbers[corner] = result.numbers[firsts_[corner]];
            });
            return result;
        }

        BinaryRecords const& records_;
        std::size_t offset_;
        InputFile const& file_;
        std::uint64_t cornerCount_;
        int partBits_;
        std::uint64_t runSize_; // records of a run, which one thread visits
        std::vector<std::uint64_t> runParts_; // the place of the first corner of each run and part in `corners_`
        std::vector<std::uint64_t> partOffsets_;
        Orvan::Array<WeldedCorner> corners_; // by part, then in ascending order
        Orvan::Array<unsigned int> firsts_;
    };

}

std::optional<WeldedPoints> weldRecords(BinaryRecords const& records, std::size_t offset, InputFile const& file)
{
    return RecordWelder(records, offset, file).weld();
}

}
