#include <TessaraGeometryVolume/VolumeBuilder.h>

#include "RecentTiles.h"
#include "boxParts.h"

#include <TessaraGeometryVolume/HaloTile.h>

#include <bit>
#include <stdexcept>
#include <string>
#include <unordered_map>
#include <utility>

namespace TSR::TileTree3D {

using Internal::floorDivide;
using Internal::Index;
using Internal::rangeOf;
using Internal::RecentTiles;
using Internal::tileOfVoxel;
using Internal::VoxelRange;

namespace {

    int linearIndex(int side, int i, int j, int k)
    {
        return i + (j + k * side) * side;
    }

    Index sum(Index const& a, Index const& b)
    {
        return {a.i + b.i, a.j + b.j, a.k + b.k};
    }

    /// Whether `visit(step)` is true for a tile itself (a step of 0) or any of its seven upper neighbors.
    template <class Visit> bool anyUpwards(Visit const& visit)
    {
        for (int across = 0; across < 8; ++across)
            if (visit(Index{across & 1, across >> 1 & 1, across >> 2 & 1}))
                return true;
        return false;
    }

    template <class Traits> class Builder {
    public:
        explicit Builder(VolumeSource const& source)
            : source_(source)
            , volume_{{}, Channel<Traits, float>(), VoxelTopology(source.offsetType), source.background}
        {
        }

        Volume<Traits> build()
        {
            check();
            addLists([&](int depth) { return depth < source_.depth; });
            insertTiles();
            prepareBoxes();
            forEachRoot([&](Index const& root, Boxes boxes) { fillListedTiles(root, 0, std::move(boxes)); });
            addLists([&](int depth) { return depth == source_.depth; });
            addCubes();
            addBlock();
            forEachRoot([&](Index const& root, Boxes boxes) { addBoxes(root, 0, std::move(boxes)); });
            addLists([&](int depth) { return depth > source_.depth; });
            volume_.container.completeParents();
            fillCoarserTiles();
            return std::move(volume_);
        }

    private:
        static constexpr int kSide = Traits::kSide;
        static constexpr int kChildren = Traits::kChildrenPerAxis;
        using Tile = typename Container<Traits>::TileType;
        using Boxes = std::vector<ConstantBox const*>;

        static void requireDepth(int depth)
        {
            if (depth < 0 || depth > Traits::kDeepest)
                throw std::invalid_argument(
                    "there is no depth " + std::to_string(depth) + " among 0 to " + std::to_string(Traits::kDeepest));
        }

        void check() const
        {
            requireDepth(source_.depth);
            for (VoxelList const& list : source_.lists)
                requireDepth(list.depth);
            requireDepth(source_.coarsestDepth.value_or(0));
            if (source_.offsetType > 7)
                throw std::invalid_argument("the offset type has a bit beyond the three axes");
        }

        /// The lower corner of the tile that is `number` tiles away from the origin along each axis.
        static Index originOf(Index const& number, int depth)
        {
            std::int64_t const width = Traits::tileWidth(depth);
            Index const origin{number.i * width, number.j * width, number.k * width};
            for (std::int64_t const index : {origin.i, origin.j, origin.k})
                if (index + width <= INT32_MIN || index > INT32_MAX)
                    throw std::invalid_argument("a voxel is beyond 32-bit indices");
            return origin;
        }

        static TreeIndex treeIndex(std::uint32_t tile, int depth) { return {tile, static_cast<std::uint32_t>(depth)}; }

        TreeIndex insertTile(Index const& number, int depth)
        {
            Index const origin = originOf(number, depth);
            bool isNew = false;
            return treeIndex(volume_.container.findOrInsert(origin.i, origin.j, origin.k, depth, isNew), depth);
        }

        bool hasValues(TreeIndex tile) const { return valuesAt(tile) != nullptr; }
        float const* valuesAt(TreeIndex tile) const { return volume_.channel.tileData(tile).values(); }

        /// The values of a tile with a source, initialized from a coarser one. Not inlined: it would slow down the loops
        /// over voxels, most of which are in a recent tile.
        [[gnu::noinline]] float* valuesOfTile(Index const& number, int depth)
        {
            TreeIndex const tile = insertTile(number, depth);
            bool const isNew = !hasValues(tile);
            float* const values = volume_.channel.values(tile);
            if (isNew) {
                volume_.container.setTerminal(static_cast<std::uint32_t>(tile.index), depth);
                copyFromCoarser(originOf(number, depth), depth, values);
                coarsestTerminal_ = std::min(coarsestTerminal_, depth);
            }
            return values;
        }

        template <class Rule> static void forEachVoxelOfTile(Rule const& rule)
        {
            for (int k = 0; k < kSide; ++k)
                for (int j = 0; j < kSide; ++j)
                    for (int i = 0; i < kSide; ++i)
                        rule(i, j, k);
        }

        /// Gives each voxel of a new tile the value of the coarse voxel that contains it, or `background`.
        void copyFromCoarser(Index const& origin, int depth, float* values) const
        {
            for (int coarser = depth - 1; coarser >= coarsestTerminal_; --coarser) {
                Tile const& tile = volume_.container.find(origin.i, origin.j, origin.k, coarser);
                if (!tile.isTerminal || tile.division >= 0)
                    continue;
                float const* const coarse = valuesAt(tile.treeIndex());
                // In voxels of the new tile's depth.
                std::int64_t const width = Traits::tileWidth(depth);
                std::int64_t const ratio = Traits::tileWidth(coarser) / width;
                auto const coarseVoxel = [=](std::int64_t tileOrigin, std::int64_t from, int voxel) {
                    return static_cast<int>(((tileOrigin - from) / width * kSide + voxel) / ratio);
                };
                forEachVoxelOfTile([&](int i, int j, int k) {
                    values[linearIndex(kSide, i, j, k)] = coarse[linearIndex(kSide, coarseVoxel(origin.i, tile.i, i),
                        coarseVoxel(origin.j, tile.j, j), coarseVoxel(origin.k, tile.k, k))];
                });
                return;
            }
            std::fill_n(values, Traits::kVoxelCount, source_.background);
        }

        // ---- Listed voxels

        float& valueOfVoxel(Index const& voxel, int depth, RecentTiles& recent)
        {
            Index const tile = tileOfVoxel<kSide>(voxel);
            RecentTiles::Entry& entry = recent.at(tile);
            if (!entry.isOf(tile)) [[unlikely]]
                entry = {tile, valuesOfTile(tile, depth)};
            return entry.values[linearIndex(kSide, static_cast<int>(voxel.i - tile.i * kSide),
                static_cast<int>(voxel.j - tile.j * kSide), static_cast<int>(voxel.k - tile.k * kSide))];
        }

        /// Adds lists in the order from coarse to fine.
        template <class IsIncluded> void addLists(IsIncluded const& isIncluded)
        {
            std::vector<VoxelList> lists(source_.lists.begin(), source_.lists.end());
            std::erase_if(lists, [&](VoxelList const& list) { return !isIncluded(list.depth); });
            std::stable_sort(
                lists.begin(), lists.end(), [](VoxelList const& a, VoxelList const& b) { return a.depth < b.depth; });
            for (VoxelList const& list : lists) {
                RecentTiles recent(list.voxels.size());
                for (Voxel const& voxel : list.voxels)
                    valueOfVoxel({voxel.i, voxel.j, voxel.k}, list.depth, recent) = voxel.value;
            }
        }

        /// Calls `visit(i, j, k, value)` for the voxels of all cubes.
        template <class Visit> void forEachVoxelOfCubes(Visit const& visit) const
        {
            for (VoxelCube const& cube : source_.cubes) {
                float const* value = source_.cubeValues.data() + cube.firstValue;
                for (int k = 0; k < 8; ++k)
                    for (std::uint64_t left = cube.active[static_cast<std::size_t>(k)]; left; left &= left - 1) {
                        int const bit = std::countr_zero(left);
                        visit(std::int64_t{cube.first.i} + bit % 8, std::int64_t{cube.first.j} + bit / 8,
                            std::int64_t{cube.first.k} + k, *value++);
                    }
            }
        }

        void addCubes()
        {
            RecentTiles recent(source_.cubeValues.size());
            forEachVoxelOfCubes([&](std::int64_t i, std::int64_t j, std::int64_t k, float value) {
                valueOfVoxel({i, j, k}, source_.depth, recent) = value;
            });
        }

        /// Inserts all tiles with voxels of lists, cubes and the block, and their ancestors: boxes are stored
        /// differently next to them.
        void insertTiles()
        {
            if (source_.boxes.empty())
                return;
            auto const inserter = [&](int depth) {
                return [this, depth, current = RecentTiles::Entry()](
                           std::int64_t i, std::int64_t j, std::int64_t k) mutable {
                    Index const tile = tileOfVoxel<kSide>({i, j, k});
                    if (!current.isOf(tile))
                        insertTile(tile, depth);
                    current.tile = tile;
                };
            };
            for (VoxelList const& list : source_.lists) {
                hasCoarserData_ |= list.depth < source_.depth && !list.voxels.empty();
                auto insert = inserter(list.depth);
                for (Voxel const& voxel : list.voxels)
                    insert(voxel.i, voxel.j, voxel.k);
            }
            auto insert = inserter(source_.depth);
            forEachVoxelOfCubes([&](std::int64_t i, std::int64_t j, std::int64_t k, float) { insert(i, j, k); });
            forEachTileOfBlock([&](Index const& tile, VoxelRange const&) { insertTile(tile, source_.depth); });
            hasCoarserData_ |= source_.coarsestDepth.value_or(source_.depth) < source_.depth;
            volume_.container.completeParents();
        }

        /// Calls `visit(number, voxels)` for tiles with voxels of the block.
        template <class Visit> void forEachTileOfBlock(Visit const& visit) const
        {
            DenseBlock const& block = source_.block;
            VoxelRange const range{{block.first.i, block.first.j, block.first.k},
                {std::int64_t{block.first.i} + block.size.i, std::int64_t{block.first.j} + block.size.j,
                    std::int64_t{block.first.k} + block.size.k}};
            if (!range.isEmpty())
                forEachTileIn(
                    range, kSide, [&](Index const& tile) { visit(tile, range.overlapWith(rangeOfTile(tile, kSide))); });
        }

        void addBlock()
        {
            DenseBlock const& block = source_.block;
            forEachTileOfBlock([&](Index const& tile, VoxelRange const& inside) {
                float* const values = valuesOfTile(tile, source_.depth);
                for (std::int64_t k = inside.first.k; k < inside.end.k; ++k)
                    for (std::int64_t j = inside.first.j; j < inside.end.j; ++j) {
                        std::int64_t const rowBegin =
                            ((k - block.first.k) * block.size.j + (j - block.first.j)) * block.size.i - block.first.i;
                        std::copy(block.values + rowBegin + inside.first.i, block.values + rowBegin + inside.end.i,
                            values
                                + linearIndex(kSide, static_cast<int>(inside.first.i - tile.i * kSide),
                                    static_cast<int>(j - tile.j * kSide), static_cast<int>(k - tile.k * kSide)));
                    }
            });
        }

        // ---- Boxes

        /// The width of a tile of `depth`, in voxels of the source's depth.
        std::int64_t voxelsOfTile(int depth) const
        {
            return Traits::tileWidth(depth) / Traits::tileWidth(source_.depth) * kSide;
        }

        static VoxelRange rangeOfTile(Index const& number, std::int64_t voxels)
        {
            return {{number.i * voxels, number.j * voxels, number.k * voxels},
                {(number.i + 1) * voxels, (number.j + 1) * voxels, (number.k + 1) * voxels}};
        }

        /// The voxels that samples in a tile can depend on: its own, and those of its upper neighbors at the source's
        /// depth.
        static VoxelRange withUpperNeighbors(VoxelRange const& tile)
        {
            return {tile.first, {tile.end.i + kSide, tile.end.j + kSide, tile.end.k + kSide}};
        }

        template <class Visit>
        static void forEachTileIn(VoxelRange const& range, std::int64_t voxels, Visit const& visit)
        {
            for (std::int64_t k = floorDivide(range.first.k, voxels); k * voxels < range.end.k; ++k)
                for (std::int64_t j = floorDivide(range.first.j, voxels); j * voxels < range.end.j; ++j)
                    for (std::int64_t i = floorDivide(range.first.i, voxels); i * voxels < range.end.i; ++i)
                        visit(Index{i, j, k});
        }

        void prepareBoxes()
        {
            boxes_.reserve(source_.boxes.size());
            for (ConstantBox const& box : source_.boxes) {
                auto const [first, end] = rangeOf(box);
                if (rangeOf(box).isEmpty())
                    continue;
                for (Index const& corner : {first, Index{end.i - 1, end.j - 1, end.k - 1}})
                    originOf(tileOfVoxel<kSide>(corner), source_.depth); // throws if it is out of range
                boxes_.push_back(&box);
            }
        }

        /// Calls `visit(number, boxes)` for the tiles of depth 0 near boxes, with the boxes that samples in them depend
        /// on.
        template <class Visit> void forEachRoot(Visit const& visit) const
        {
            if (boxes_.empty())
                return;
            VoxelRange all = rangeOf(*boxes_.front());
            for (ConstantBox const* const box : boxes_)
                all = all.boundsWith(rangeOf(*box));
            forEachTileIn(all, voxelsOfTile(0), [&](Index const& root) {
                VoxelRange const read = withUpperNeighbors(rangeOfTile(root, voxelsOfTile(0)));
                Boxes boxes;
                std::copy_if(boxes_.begin(), boxes_.end(), std::back_inserter(boxes),
                    [&](ConstantBox const* const box) { return rangeOf(*box).overlaps(read); });
                visit(root, std::move(boxes));
            });
        }

        /// Calls `visit(number, boxes)` for the children of a tile, with the boxes that samples in them depend on.
        template <class Visit> void forEachChild(Index const& number, int depth, Boxes boxes, Visit const& visit) const
        {
            std::int64_t const voxels = voxelsOfTile(depth + 1);
            VoxelRange const children{{number.i * kChildren, number.j * kChildren, number.k * kChildren},
                {(number.i + 1) * kChildren, (number.j + 1) * kChildren, (number.k + 1) * kChildren}};
            auto const place = [&](Index const& child) {
                return static_cast<std::size_t>(linearIndex(kChildren, static_cast<int>(child.i - children.first.i),
                    static_cast<int>(child.j - children.first.j), static_cast<int>(child.k - children.first.k)));
            };
            std::array<Boxes, Traits::kChildCount> boxesOfChild;
            for (ConstantBox const* const box : boxes) {
                auto const [first, end] = rangeOf(*box);
                VoxelRange const dependent{{first.i - kSide, first.j - kSide, first.k - kSide}, end};
                VoxelRange const inside = dependent.overlapWith(rangeOfTile(number, voxelsOfTile(depth)));
                if (!inside.isEmpty())
                    forEachTileIn(
                        inside, voxels, [&](Index const& child) { boxesOfChild[place(child)].push_back(box); });
            }
            Boxes().swap(boxes); // release it before the recursion, as there may be many
            forEachTileIn(children, 1, [&](Index const& child) {
                if (!boxesOfChild[place(child)].empty())
                    visit(child, std::move(boxesOfChild[place(child)]));
            });
        }

        bool isInserted(Index const& number, int depth) const
        {
            std::int64_t const width = Traits::tileWidth(depth);
            Tile const& tile = volume_.container.find(number.i * width, number.j * width, number.k * width, depth);
            return tile.valid && tile.division < 0;
        }

        /// Writes the boxes into tiles that also contain listed voxels, before the lists overwrite them.
        void fillListedTiles(Index const& number, int depth, Boxes boxes)
        {
            if (!isInserted(number, depth))
                return;
            if (depth == source_.depth)
                fillVoxels(number, boxes);
            else
                forEachChild(number, depth, std::move(boxes),
                    [&](Index const& child, Boxes inside) { fillListedTiles(child, depth + 1, std::move(inside)); });
        }

        void fillVoxels(Index const& number, Boxes const& boxes)
        {
            VoxelRange const tile = rangeOfTile(number, kSide);
            for (ConstantBox const* const box : boxes)
                if (VoxelRange const inside = rangeOf(*box).overlapWith(tile); !inside.isEmpty())
                    fillVoxels(number, inside, box->value, valuesOfTile(number, source_.depth));
        }

        void fillVoxels(Index const& number, VoxelRange const& inside, float value, float* values) const
        {
            for (std::int64_t k = inside.first.k; k < inside.end.k; ++k)
                for (std::int64_t j = inside.first.j; j < inside.end.j; ++j)
                    std::fill_n(values
                            + linearIndex(kSide, static_cast<int>(inside.first.i - number.i * kSide),
                                static_cast<int>(j - number.j * kSide), static_cast<int>(k - number.k * kSide)),
                        inside.end.i - inside.first.i, value);
        }

        void addBoxes(Index const& number, int depth, Boxes boxes)
        {
            VoxelRange const tile = rangeOfTile(number, voxelsOfTile(depth));
            if (std::none_of(boxes.begin(), boxes.end(),
                    [&](ConstantBox const* const box) { return rangeOf(*box).overlaps(tile); }))
                return;
            if (depth == source_.depth)
                addTileOfBoxes(number, boxes);
            else if (hasCoarserData_ || isAmongListed(number, depth) || !divide(number, depth, boxes))
                forEachChild(number, depth, std::move(boxes),
                    [&](Index const& child, Boxes inside) { addBoxes(child, depth + 1, std::move(inside)); });
        }

        /// Whether samples in a tile may depend on listed voxels.
        bool isAmongListed(Index const& number, int depth) const
        {
            return anyUpwards([&](Index const& step) { return isInserted(sum(number, step), depth); });
        }

        void addTileOfBoxes(Index const& number, Boxes const& boxes)
        {
            if (isInserted(number, source_.depth)) // and filled
                return;
            auto const value = hasCoarserData_ ? std::nullopt : commonValue(boxes, rangeOfTile(number, kSide));
            if (!value) {
                fillVoxels(number, boxes);
                return;
            }
            TreeIndex const tile = insertTile(number, source_.depth);
            volume_.container.setTerminal(static_cast<std::uint32_t>(tile.index), source_.depth);
            coarsestTerminal_ = std::min(coarsestTerminal_, source_.depth);
            shareConstant(tile, *value);
        }

        /// Gives a tile of the source's depth one value everywhere, which is stored once per value.
        void shareConstant(TreeIndex tile, float value)
        {
            auto const [known, isNew] = constants_.try_emplace(std::bit_cast<std::uint32_t>(value), tile);
            if (isNew)
                std::fill_n(volume_.channel.values(tile), Traits::kVoxelCount, value);
            else
                volume_.channel.share(tile, known->second);
        }

        /// Divides a tile into repeated tiles. \return false if that would not save memory
        bool divide(Index const& number, int depth, Boxes const& boxes)
        {
            VoxelRange const tile = rangeOfTile(number, voxelsOfTile(depth));
            std::int32_t division;
            if (auto const value = commonValue(boxes, withUpperNeighbors(tile))) {
                auto const [known, isNew] = constantDivisions_.try_emplace(std::bit_cast<std::uint32_t>(*value), 0);
                if (isNew) {
                    std::uint32_t const repeated = addRepeated(tileOfVoxel<kSide>(tile.first));
                    shareConstant(treeIndex(repeated, source_.depth), *value);
                    known->second = volume_.container.addDivision({{{{0}, {0}, {0}}}, {repeated}});
                }
                division = known->second;
            } else {
                constexpr std::size_t kMostBoxes = 64, kMostParts = 512, kWorthwhile = 4;
                if (boxes.size() > kMostBoxes)
                    return false;
                Division parts{Internal::partsOf(tile, kSide, boxes), {}};
                std::size_t const partCount = parts.begins[0].size() * parts.begins[1].size() * parts.begins[2].size();
                double const along = static_cast<double>(voxelsOfTile(depth) / kSide);
                if (partCount > kMostParts || static_cast<double>(kWorthwhile * partCount) > along * along * along)
                    return false;
                fillParts(tileOfVoxel<kSide>(tile.first), boxes, parts);
                division = volume_.container.addDivision(std::move(parts));
            }
            TreeIndex const divided = insertTile(number, depth);
            volume_.container.divide(static_cast<std::uint32_t>(divided.index), depth, division);
            return true;
        }

        std::uint32_t addRepeated(Index const& number)
        {
            Index const origin = originOf(number, source_.depth);
            return volume_.container.addRepeated(origin.i, origin.j, origin.k, source_.depth);
        }

        void fillParts(Index const& first, Boxes const& boxes, Division& parts)
        {
            for (std::uint32_t const k : parts.begins[2])
                for (std::uint32_t const j : parts.begins[1])
                    for (std::uint32_t const i : parts.begins[0])
                        parts.tiles.push_back(fillPart(sum(first, {i, j, k}), boxes));
        }

        std::uint32_t fillPart(Index const& number, Boxes const& boxes)
        {
            VoxelRange const tile = rangeOfTile(number, kSide);
            std::uint32_t repeated = Division::kNoRepeated;
            float* values = nullptr;
            for (ConstantBox const* const box : boxes) {
                VoxelRange const inside = rangeOf(*box).overlapWith(tile);
                if (inside.isEmpty())
                    continue;
                if (!values) {
                    repeated = addRepeated(number);
                    values = volume_.channel.values(treeIndex(repeated, source_.depth));
                    std::fill_n(values, Traits::kVoxelCount, source_.background);
                }
                fillVoxels(number, inside, box->value, values);
            }
            return repeated;
        }

        // ---- Coarser tiles

        void fillCoarserTiles()
        {
            int const coarsest =
                std::min(volume_.channel.coarsestDepth(), source_.coarsestDepth.value_or(Traits::kDepthCount));
            for (int depth = Traits::kDeepest; depth >= coarsest; --depth) {
                for (std::size_t number = 0; number < volume_.container.tileCount(depth); ++number) {
                    Tile const& tile = volume_.container.tile(number, depth);
                    if (!hasValues(tile.treeIndex()) && tile.division < 0)
                        copyFromCoarser({tile.i, tile.j, tile.k}, depth, volume_.channel.values(tile.treeIndex()));
                }
                if (depth < Traits::kDeepest)
                    for (std::size_t child = 0; child < volume_.container.tileCount(depth + 1); ++child)
                        restrictToParent(volume_.container.tile(child, depth + 1));
            }
        }

        /// Restricts a tile's values to its part of the parent: takes the voxel at the same place along axes whose
        /// offset bit is set, and the mean along axes whose bit is clear.
        void restrictToParent(Tile const& tile)
        {
            if (volume_.container.tile(tile.parentTreeIndex()).isTerminal)
                return; // it has a source of its own
            float const* const fine = valuesAt(tile.treeIndex());
            float* const coarse = volume_.channel.values(tile.parentTreeIndex());
            auto const fineValue = [&](int i, int j, int k) { return fine[linearIndex(kSide, i, j, k)]; };
            IJK const child = tile.childIJK();
            auto const spanAlong = [&](int axis) { return source_.offsetType >> axis & 1 ? 1 : kChildren; };
            int const spanX = spanAlong(0), spanY = spanAlong(1), spanZ = spanAlong(2);
            constexpr int kCovered = Traits::kParentVoxels;
            for (int z = 0; z < kCovered; ++z)
                for (int y = 0; y < kCovered; ++y)
                    for (int x = 0; x < kCovered; ++x) {
                        // Summed as differences, so that the mean of equal values is that value to the bit.
                        float const first = fineValue(x * kChildren, y * kChildren, z * kChildren);
                        float sum = 0;
                        for (int k = 0; k < spanZ; ++k)
                            for (int j = 0; j < spanY; ++j)
                                for (int i = 0; i < spanX; ++i)
                                    sum += fineValue(x * kChildren + i, y * kChildren + j, z * kChildren + k) - first;
                        coarse[linearIndex(kSide, child.i * kCovered + x, child.j * kCovered + y,
                            child.k * kCovered + z)] = first + sum / static_cast<float>(spanX * spanY * spanZ);
                    }
        }

        VolumeSource const& source_;
        Volume<Traits> volume_;
        int coarsestTerminal_ = Traits::kDepthCount;
        bool hasCoarserData_ = false; // at depths coarser than the source's
        Boxes boxes_;
        // By the bits of the value.
        std::unordered_map<std::uint32_t, TreeIndex> constants_;
        std::unordered_map<std::uint32_t, std::int32_t> constantDivisions_;
    };

}

template <class Traits> Volume<Traits> buildVolume(VolumeSource const& source)
{
    return Builder<Traits>(source).build();
}

template <class Traits> Channel<Traits, float> makeHaloChannel(Volume<Traits> const& volume)
{
    constexpr int kPadded = Traits::kSide + 1;
    Channel<Traits, float> padded(kPadded);
    typename Container<Traits>::ConstTileAccessor accessor(volume.container);
    PositiveHalo<Traits> halo, parentHalo;
    auto const pad = [&](typename Container<Traits>::TileType const& tile) {
        auto const& parent = volume.container.tile(tile.parentTreeIndex());
        parentHalo.clear();
        if (auto const ofParent = padded.template tileData<kPadded>(parent.treeIndex())) {
            parentHalo.reset(0);
            std::copy_n(ofParent.values(), halo.kVoxelCount, &parentHalo(0));
        }
        setHaloTile<Traits>(tile, &parent, volume.channel, parentHalo, 2, accessor, halo);
        if (halo)
            std::copy_n(halo.values(), halo.kVoxelCount, padded.values(tile.treeIndex()));
    };
    for (int depth = volume.channel.coarsestDepth(); depth < Traits::kDepthCount; ++depth)
        for (std::size_t number = 0; number < volume.container.tileCount(depth); ++number)
            pad(volume.container.tile(number, depth));
    for (std::uint32_t number = 0; number < volume.container.repeatedCount(); ++number)
        pad(volume.container.tile(kFirstRepeated + number, volume.container.repeatedDepth()));
    return padded;
}

template Volume<Traits2> buildVolume(VolumeSource const& source);
template Volume<Traits5> buildVolume(VolumeSource const& source);
template Channel<Traits2, float> makeHaloChannel(Volume<Traits2> const& volume);
template Channel<Traits5, float> makeHaloChannel(Volume<Traits5> const& volume);

}
