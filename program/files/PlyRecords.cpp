#include "PlyRecords.h"

#include "frame/Arrays.h"

#include <atomic>

namespace ModelingProgram {

using Tessara::Math::double3;
using Tessara::Math::float3;

namespace {

    constexpr unsigned int kLeastCorners = 3;

    class PlyRecordReader {
    public:
        PlyRecordReader(
            PlyElement& element, std::size_t begin, bool swapsBytes, InputFile const& file, GeometryBuilder& builder)
            : element_(element)
            , file_(file)
            , builder_(builder)
        {
            records_.begin = begin;
            records_.count = element.count;
            records_.swapsBytes = swapsBytes;
        }

        std::optional<std::size_t> read()
        {
            using Use = PlyProperty::Use;
            auto const isOwn = [](PlyProperty const& p) { return p.use != Use::Nothing; };
            bool const isSkipped = std::none_of(element_.properties.begin(), element_.properties.end(), isOwn);
            if (element_.count == 0)
                return records_.begin;
            if (layOut(Lists::Equal)) {
                bool const isRead = isSkipped && lists_.empty() ? true : readElements();
                if (isRead) {
                    for (List const& list : lists_)
                        list.property->equalLists = {list.length, list.valueOffset, records_};
                    return records_.startOf(records_.count);
                }
            }
            auto const isOtherList = [](PlyProperty const& p) { return p.lengthType && p.use != Use::Indices; };
            auto const isIndices = [](PlyProperty const& p) { return p.use == Use::Indices; };
            bool const hasOnlyIndices =
                std::none_of(element_.properties.begin(), element_.properties.end(), isOtherList)
                && std::any_of(element_.properties.begin(), element_.properties.end(), isIndices);
            if (hasOnlyIndices && layOut(Lists::Different) && findLists() && readElements())
                return records_.startOf(records_.count);
            return std::nullopt;
        }

    private:
        enum class Lists { Equal, Different };

        struct List {
            PlyProperty* property;
            std::size_t lengthOffset;
            std::size_t valueOffset;
            unsigned int length;
        };
        struct Axis {
            PlyProperty const* property;
            std::size_t offset;
        };

        /// Finds the place of each property in the records, from the first record. \return whether all of them fit in
        /// the file
        bool layOut(Lists kind)
        {
            lists_.clear();
            axes_.clear();
            fields_.clear();
            std::size_t offset = 0;
            for (PlyProperty& property : element_.properties) {
                std::size_t const bytes = sizeOf(property.type);
                if (property.lengthType) {
                    std::size_t const lengthBytes = sizeOf(*property.lengthType);
                    if (offset + lengthBytes > file_.size - records_.begin)
                        return false;
                    long long const length = lengthAt(records_.begin + offset, *property.lengthType);
                    if (length < 0 || static_cast<std::size_t>(length) > file_.size / bytes)
                        return false;
                    lists_.push_back({&property, offset, offset + lengthBytes, static_cast<unsigned int>(length)});
                    offset += lengthBytes + (kind == Lists::Equal ? static_cast<std::size_t>(length) * bytes : 0);
                } else {
                    if (property.use == PlyProperty::Use::Position)
                        axes_.push_back({&property, offset});
                    else if (property.use == PlyProperty::Use::Value)
                        fields_.push_back({offset, kind == Lists::Different && !lists_.empty(), bytes, 1,
                            property.target, property.stride});
                    offset += bytes;
                }
            }
            records_.recordBytes = offset;
            return records_.count <= (file_.size - records_.begin) / std::max<std::size_t>(1, offset);
        }

        long long lengthAt(std::size_t at, PlyScalar type) const
        {
            char bytes[sizeof(double)];
            file_.read(at, sizeOf(type), bytes);
            return withPlyScalar(type, [&]<class T>(std::type_identity<T>) {
                return static_cast<long long>(loadNumber<T>(bytes, records_.swapsBytes));
            });
        }

        /// Adds up the lengths of the point indices, record by record, because each begins where the last one ends.
        bool findLists()
        {
            offsets_ = Orvan::Array<unsigned int>(element_.count + 1, Orvan::kUninitialized);
            List const& list = lists_[0];
            std::size_t const end = withPlyScalar(*list.property->lengthType, [&]<class T>(std::type_identity<T>) {
                return addUpLengths<T>(list.lengthOffset, sizeOf(list.property->type));
            });
            records_.listOffsets = offsets_.data;
            records_.listScalarBytes = sizeOf(list.property->type);
            return end != 0;
        }

        /// \return the end of the last record, 0 if a list is too short or too long
        template <class T> std::size_t addUpLengths(std::size_t lengthOffset, std::size_t valueBytes)
        {
            constexpr std::size_t kWindowBytes = std::size_t{1} << 20;
            auto const buffer = std::make_unique_for_overwrite<char[]>(kWindowBytes);
            char const* window = nullptr; // the bytes of the file from `windowBegin` to `windowEnd`
            std::size_t windowBegin = 0, windowEnd = 0, at = records_.begin;
            std::uint64_t total = 0;
            offsets_[0] = 0;
            for (std::uint64_t record = 0; record != records_.count; ++record) {
                if (at + lengthOffset + sizeof(T) > windowEnd) {
                    windowBegin = at + lengthOffset;
                    windowEnd = std::min(file_.size, windowBegin + kWindowBytes);
                    if (windowBegin + sizeof(T) > file_.size)
                        return 0;
                    window = file_.loadedBytes(windowBegin, windowEnd - windowBegin);
                    if (!window)
                        file_.read(windowBegin, windowEnd - windowBegin, buffer.get());
                    window = window ? window : buffer.get();
                }
                auto const length = static_cast<long long>(
                    loadNumber<T>(window + (at + lengthOffset - windowBegin), records_.swapsBytes));
                total += static_cast<std::uint64_t>(length);
                if (length < kLeastCorners || total >= GeometryBuilder::kMostElements)
                    return 0;
                offsets_[record + 1] = static_cast<unsigned int>(total);
                at += records_.recordBytes + static_cast<std::size_t>(length) * valueBytes;
            }
            return at <= file_.size ? at : 0;
        }

        /// Reads records of this layout and adds points or faces, if all of them are usable.
        bool readElements()
        {
            fields_ = joined(std::move(fields_), records_.swapsBytes);
            Orvan::Array<float3> positions;
            Orvan::Array<double3> widePositions;
            if (!axes_.empty())
                preparePoints(positions, widePositions);
            auto const indices = std::find_if(lists_.begin(), lists_.end(),
                [](List const& list) { return list.property->use == PlyProperty::Use::Indices; });
            Orvan::Array<unsigned int> faceVertex;
            if (indices != lists_.end() && !prepareFaces(*indices, faceVertex))
                return false;
            bool const isUsable = forEachBlock(records_, file_, [&](RecordBlock const& block) {
                for (List const& list : lists_)
                    if (!records_.listOffsets && !haveLength(list, block))
                        return false;
                for (RecordField const& field : fields_)
                    copyField(field, block);
                return (axes_.empty() || readPoints(block, positions, widePositions))
                    && (indices == lists_.end() || readCorners(*indices, block, faceVertex.data));
            });
            if (isUsable && !axes_.empty())
                builder_.setPoints(std::move(positions), std::move(widePositions), largestLoss_);
            if (isUsable && indices != lists_.end())
                addFaces(indices->length, std::move(faceVertex));
            return isUsable;
        }

        void preparePoints(Orvan::Array<float3>& positions, Orvan::Array<double3>& widePositions)
        {
            positions = Modeling::uninitializedArray<float3>(element_.count);
            if (builder_.movesPositions())
                widePositions = Modeling::uninitializedArray<double3>(element_.count);
            std::vector<Axis> converted;
            std::vector<RecordField> floats;
            for (Axis const& axis : axes_) {
                auto* const target = reinterpret_cast<std::byte*>(&positions.data->x + axis.property->axis);
                if (axis.property->type == PlyScalar::Float && widePositions.empty())
                    floats.push_back({axis.offset, false, sizeof(float), 1, target, sizeof(float3)});
                else
                    converted.push_back(axis);
            }
            floats = joined(std::move(floats), records_.swapsBytes);
            fields_.insert(fields_.end(), floats.begin(), floats.end());
            convertedAxes_ = std::move(converted);
        }

        bool prepareFaces(List const& indices, Orvan::Array<unsigned int>& faceVertex)
        {
            std::uint64_t const cornerCount =
                records_.listOffsets ? offsets_[element_.count] : std::uint64_t{indices.length} * element_.count;
            if (indices.length < kLeastCorners || cornerCount >= GeometryBuilder::kMostElements)
                return false;
            faceVertex = Modeling::uninitializedArray<unsigned int>(cornerCount);
            return true;
        }

        void addFaces(unsigned int length, Orvan::Array<unsigned int> faceVertex)
        {
            if (!records_.listOffsets)
                offsets_ = Modeling::offsetsFromCounts(element_.count, [=](std::size_t) { return length; });
            builder_.setFaces(std::move(faceVertex), std::move(offsets_));
        }

        static bool haveLength(List const& list, RecordBlock const& block)
        {
            return withPlyScalar(*list.property->lengthType, [&]<class T>(std::type_identity<T>) {
                char const* at = block.bytes + list.lengthOffset;
                bool areEqual = true;
                for (std::uint64_t i = block.first; i != block.end; ++i, at += block.records.recordBytes)
                    areEqual &= loadNumber<T>(at, block.records.swapsBytes) == static_cast<T>(list.length);
                return areEqual;
            });
        }

        /// \return whether the points of the block are finite
        bool readPoints(RecordBlock const& block, Orvan::Array<float3>& positions, Orvan::Array<double3>& widePositions)
        {
            double loss = 0;
            for (Axis const& axis : convertedAxes_)
                withPlyScalar(axis.property->type, [&]<class T>(std::type_identity<T>) {
                    int const component = axis.property->axis;
                    for (std::uint64_t i = block.first; i != block.end; ++i) {
                        auto const wide =
                            static_cast<double>(loadNumber<T>(block.at(i) + axis.offset, block.records.swapsBytes));
                        (&positions[i].x)[component] = static_cast<float>(wide);
                        if (!widePositions.empty())
                            (&widePositions[i].x)[component] = wide;
                        loss = std::max(loss, lossOf(wide)); // NaN is refused below
                    }
                });
            if (loss != 0)
                raiseLoss(loss);
            bool areFinite = true;
            for (std::uint64_t i = block.first; i != block.end; ++i)
                areFinite &= isFinite(positions[i]);
            return areFinite;
        }

        void raiseLoss(double loss)
        {
            double known = largestLoss_;
            while (known < loss && !largestLoss_.compare_exchange_weak(known, loss)) { }
        }

        /// \return whether the corners of the block refer to points
        bool readCorners(List const& indices, RecordBlock const& block, unsigned int* faceVertex) const
        {
            return withPlyScalar(indices.property->type, [&]<class T>(std::type_identity<T>) {
                if constexpr (std::is_integral_v<T>) {
                    if (records_.listOffsets)
                        return readCornersOf<T>(
                            indices, block, [&](std::uint64_t face) { return offsets_[face + 1] - offsets_[face]; },
                            faceVertex + offsets_[block.first]);
                    unsigned int* const target = faceVertex + block.first * indices.length;
                    if (indices.length == 3)
                        return readCornersOf<T>(
                            indices, block, [](std::uint64_t) { return 3u; }, target);
                    return readCornersOf<T>(
                        indices, block, [&](std::uint64_t) { return indices.length; }, target);
                } else {
                    return false;
                }
            });
        }

        template <class T, class LengthOf> bool readCornersOf(
            List const& indices, RecordBlock const& block, LengthOf const& lengthOf, unsigned int* corner) const
        {
            std::uint64_t const pointCount = builder_.expectedPointCount();
            bool const swaps = block.records.swapsBytes;
            char const* at = block.bytes;
            bool areInRange = true;
            for (std::uint64_t face = block.first; face != block.end; ++face) {
                unsigned int const length = lengthOf(face);
                char const* value = at + indices.valueOffset;
                for (unsigned int i = 0; i != length; ++i, value += sizeof(T)) {
                    T const point = loadNumber<T>(value, swaps);
                    areInRange &= static_cast<std::uint64_t>(point) < pointCount; // negative numbers are large then
                    *corner++ = static_cast<unsigned int>(point);
                }
                at += block.records.recordBytes + (block.records.listOffsets ? length * sizeof(T) : 0);
            }
            return areInRange;
        }

        PlyElement& element_;
        InputFile const& file_;
        GeometryBuilder& builder_;
        BinaryRecords records_;
        std::vector<List> lists_;
        std::vector<Axis> axes_;
        std::vector<Axis> convertedAxes_; // those that are not copied like other properties
        std::vector<RecordField> fields_;
        Orvan::Array<unsigned int> offsets_; // of faces of different lengths
        std::atomic<double> largestLoss_ = 0;
    };

}

std::optional<std::size_t> readPlyRecords(
    PlyElement& element, std::size_t begin, bool swapsBytes, InputFile const& file, GeometryBuilder& builder)
{
    return PlyRecordReader(element, begin, swapsBytes, file, builder).read();
}

void copyEqualLists(PlyProperty const& property, InputFile const& file, std::byte* target)
{
    PlyEqualLists const& lists = *property.equalLists;
    std::size_t const scalarBytes = sizeOf(property.type), bytes = lists.length * scalarBytes;
    RecordField const field =
        joined({{lists.offset, false, scalarBytes, lists.length, target, bytes}}, lists.records.swapsBytes)[0];
    forEachBlock(lists.records, file, [&](RecordBlock const& block) {
        copyField(field, block);
        return true;
    });
}

}
