#include <TessaraGeometryVolume/VolumeBuilder.h>

#include <TessaraGeometryVolume/HaloTile.h>

#include <algorithm>
#include <stdexcept>
#include <string>

namespace TSR::TileTree3D {

using Internal::floorDivide;

namespace {

    struct Index {
        std::int64_t i, j, k;
    };

    /// Counted in voxels of one depth; `end` is outside.
    struct VoxelRange {
        Index first, end;

        bool isEmpty() const { return first.i >= end.i || first.j >= end.j || first.k >= end.k; }
        VoxelRange overlapWith(VoxelRange const& other) const
        {
            return {
                {std::max(first.i, other.first.i), std::max(first.j, other.first.j), std::max(first.k, other.first.k)},
                {std::min(end.i, other.end.i), std::min(end.j, other.end.j), std::min(end.k, other.end.k)}};
        }
        bool holds(VoxelRange const& other) const
        {
            return first.i <= other.first.i && first.j <= other.first.j && first.k <= other.first.k
                && other.end.i <= end.i && other.end.j <= end.j && other.end.k <= end.k;
        }
    };

    int linearIndex(int side, int i, int j, int k)
    {
        return i + (j + k * side) * side;
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
            for (ConstantBox const& box : source_.boxes)
                addBox(box);
            addListsAndBlock();
            volume_.container.completeParents();
            fillCoarserTiles();
            return std::move(volume_);
        }

    private:
        static constexpr int kSide = Traits::kSide;
        static constexpr int kChildren = Traits::kChildrenPerAxis;
        using Tile = typename Container<Traits>::TileType;

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

        /// The tile that is `number` tiles away from the origin along each axis, with all its voxels.
        float* valuesOfTile(Index number, int depth)
        {
            std::int64_t const width = Traits::tileWidth(depth);
            Index const origin{number.i * width, number.j * width, number.k * width};
            for (std::int64_t const index : {origin.i, origin.j, origin.k})
                if (index + width <= INT32_MIN || index > INT32_MAX)
                    throw std::invalid_argument("a voxel lies beyond 32-bit indices");
            bool isNew = false;
            std::uint32_t const tile = volume_.container.findOrInsert(origin.i, origin.j, origin.k, depth, isNew);
            std::vector<float>& values = volume_.channel.values(depth);
            if (isNew) {
                volume_.container.setTerminal(tile, depth);
                coarsestTerminal_ = std::min(coarsestTerminal_, depth);
                values.insert(values.end(), Traits::kVoxelCount, volume_.background);
                if (coarsestTerminal_ < depth)
                    takeFromCoarser(origin, depth, values.data() + values.size() - Traits::kVoxelCount);
            }
            return values.data() + std::size_t{tile} * Traits::kVoxelCount;
        }

        /// What a coarser tile says of the voxels of a new one that it contains: each takes the coarse voxel it is in.
        void takeFromCoarser(Index origin, int depth, float* values) const
        {
            for (int coarser = depth - 1; coarser >= coarsestTerminal_; --coarser) {
                Tile const& tile = volume_.container.find(origin.i, origin.j, origin.k, coarser);
                if (!tile.isTerminal)
                    continue;
                auto const coarse = volume_.channel.tileData(tile.treeIndex());
                // In voxels of the new tile's depth.
                std::int64_t const width = Traits::tileWidth(depth);
                std::int64_t const ratio = Traits::tileWidth(coarser) / width;
                auto const coarseVoxel = [=](std::int64_t tileOrigin, std::int64_t from, int voxel) {
                    return static_cast<int>(((tileOrigin - from) / width * kSide + voxel) / ratio);
                };
                for (int k = 0; k < kSide; ++k)
                    for (int j = 0; j < kSide; ++j)
                        for (int i = 0; i < kSide; ++i)
                            values[linearIndex(kSide, i, j, k)] = coarse(coarseVoxel(origin.i, tile.i, i),
                                coarseVoxel(origin.j, tile.j, j), coarseVoxel(origin.k, tile.k, k));
                return;
            }
        }

        void addBox(ConstantBox const& box)
        {
            VoxelRange const range{{box.first.i, box.first.j, box.first.k}, {box.end.i, box.end.j, box.end.k}};
            if (range.isEmpty())
                return;
            addBoxWithin(range, box.value, 0, {range, voxelsOfTile(0)});
        }

        /// How many voxels of the source's depth a tile has along an axis.
        std::int64_t voxelsOfTile(int depth) const
        {
            return Traits::tileWidth(depth) / Traits::tileWidth(source_.depth) * kSide;
        }

        /// The tiles of one depth that overlap a range, by their numbers.
        struct TileRange {
            Index first, end;
            TileRange(VoxelRange const& range, std::int64_t voxels)
                : first{floorDivide(range.first.i, voxels), floorDivide(range.first.j, voxels),
                    floorDivide(range.first.k, voxels)}
                , end{floorDivide(range.end.i - 1, voxels) + 1, floorDivide(range.end.j - 1, voxels) + 1,
                      floorDivide(range.end.k - 1, voxels) + 1}
            {
            }
        };

        /// A coarse tile has one value and its neighbours others; between them samples blend. That must begin only
        /// behind the box, so a tile is taken whole where the voxels that its samples read lie in the box too.
        VoxelRange readAround(VoxelRange const& tile, int depth) const
        {
            std::int64_t const coarseVoxel = voxelsOfTile(depth) / kSide;
            auto const isAtLowerSide = [&](int axis) { return source_.offsetType >> axis & 1; };
            auto const below = [&](int axis) { return isAtLowerSide(axis) ? 0 : coarseVoxel; };
            auto const above = [&](int axis) { return isAtLowerSide(axis) ? 1 : coarseVoxel; };
            return {{tile.first.i - below(0), tile.first.j - below(1), tile.first.k - below(2)},
                {tile.end.i + above(0), tile.end.j + above(1), tile.end.k + above(2)}};
        }

        void addBoxWithin(VoxelRange const& box, float value, int depth, TileRange const& tiles)
        {
            std::int64_t const voxels = voxelsOfTile(depth);
            for (std::int64_t k = tiles.first.k; k < tiles.end.k; ++k)
                for (std::int64_t j = tiles.first.j; j < tiles.end.j; ++j)
                    for (std::int64_t i = tiles.first.i; i < tiles.end.i; ++i) {
                        VoxelRange const tile{{i * voxels, j * voxels, k * voxels},
                            {(i + 1) * voxels, (j + 1) * voxels, (k + 1) * voxels}};
                        VoxelRange const inside = box.overlapWith(tile);
                        if (depth == source_.depth)
                            fillVoxels({i, j, k}, inside, value);
                        else if (box.holds(readAround(tile, depth)))
                            std::fill_n(valuesOfTile({i, j, k}, depth), Traits::kVoxelCount, value);
                        else
                            addBoxWithin(box, value, depth + 1, {inside, voxelsOfTile(depth + 1)});
                    }
        }

        void fillVoxels(Index tile, VoxelRange const& inside, float value)
        {
            float* const values = valuesOfTile(tile, source_.depth);
            for (std::int64_t k = inside.first.k; k < inside.end.k; ++k)
                for (std::int64_t j = inside.first.j; j < inside.end.j; ++j)
                    for (std::int64_t i = inside.first.i; i < inside.end.i; ++i)
                        values[linearIndex(kSide, static_cast<int>(i - tile.i * kSide),
                            static_cast<int>(j - tile.j * kSide), static_cast<int>(k - tile.k * kSide))] = value;
        }

        /// From coarse to fine, the block after lists of its depth.
        void addListsAndBlock()
        {
            std::vector<VoxelList> lists(source_.lists.begin(), source_.lists.end());
            std::stable_sort(
                lists.begin(), lists.end(), [](VoxelList const& a, VoxelList const& b) { return a.depth < b.depth; });
            auto const finer = std::find_if(
                lists.begin(), lists.end(), [&](VoxelList const& list) { return list.depth > source_.depth; });
            std::for_each(lists.begin(), finer, [&](VoxelList const& list) { addVoxels(list); });
            addBlock();
            std::for_each(finer, lists.end(), [&](VoxelList const& list) { addVoxels(list); });
        }

        void addVoxels(VoxelList const& list)
        {
            // Neighbours in the list are mostly neighbours in space.
            Index current{};
            float* values = nullptr;
            for (Voxel const& voxel : list.voxels) {
                Index const tile{floorDivide(voxel.i, kSide), floorDivide(voxel.j, kSide), floorDivide(voxel.k, kSide)};
                if (!values || tile.i != current.i || tile.j != current.j || tile.k != current.k) {
                    values = valuesOfTile(tile, list.depth);
                    current = tile;
                }
                values[linearIndex(kSide, static_cast<int>(voxel.i - tile.i * kSide),
                    static_cast<int>(voxel.j - tile.j * kSide), static_cast<int>(voxel.k - tile.k * kSide))] =
                    voxel.value;
            }
        }

        void addBlock()
        {
            DenseBlock const& block = source_.block;
            VoxelRange const range{{block.first.i, block.first.j, block.first.k},
                {std::int64_t{block.first.i} + block.size.i, std::int64_t{block.first.j} + block.size.j,
                    std::int64_t{block.first.k} + block.size.k}};
            if (range.isEmpty())
                return;
            TileRange const tiles(range, kSide);
            for (std::int64_t k = tiles.first.k; k < tiles.end.k; ++k)
                for (std::int64_t j = tiles.first.j; j < tiles.end.j; ++j)
                    for (std::int64_t i = tiles.first.i; i < tiles.end.i; ++i)
                        copyFromBlock(range, {i, j, k});
        }

        void copyFromBlock(VoxelRange const& range, Index tile)
        {
            Index const first{tile.i * kSide, tile.j * kSide, tile.k * kSide};
            VoxelRange const inside = range.overlapWith({first, {first.i + kSide, first.j + kSide, first.k + kSide}});
            float* const values = valuesOfTile(tile, source_.depth);
            for (std::int64_t k = inside.first.k; k < inside.end.k; ++k)
                for (std::int64_t j = inside.first.j; j < inside.end.j; ++j) {
                    std::int64_t const rowBegin =
                        ((k - range.first.k) * source_.block.size.j + (j - range.first.j)) * source_.block.size.i;
                    std::copy_n(source_.block.values + rowBegin + (inside.first.i - range.first.i),
                        inside.end.i - inside.first.i,
                        values
                            + linearIndex(kSide, static_cast<int>(inside.first.i - first.i),
                                static_cast<int>(j - first.j), static_cast<int>(k - first.k)));
                }
        }

        void fillCoarserTiles()
        {
            int const coarsest = std::min(coarsestTerminal_, source_.coarsestDepth.value_or(Traits::kDepthCount));
            for (int depth = Traits::kDeepest; depth >= coarsest; --depth) {
                std::size_t const tiles = volume_.container.tileCount(depth);
                std::vector<float>& values = volume_.channel.values(depth);
                std::size_t const known = values.size() / Traits::kVoxelCount;
                values.resize(tiles * Traits::kVoxelCount, volume_.background);
                for (std::size_t number = known; number < tiles; ++number) {
                    Tile const& tile = volume_.container.tile(number, depth);
                    takeFromCoarser({tile.i, tile.j, tile.k}, depth, values.data() + number * Traits::kVoxelCount);
                }
                if (depth < Traits::kDeepest)
                    for (std::size_t child = 0; child < volume_.container.tileCount(depth + 1); ++child)
                        restrictToParent(volume_.container.tile(child, depth + 1));
            }
        }

        /// Along an axis with a set bit the voxel at the same place, along one with a clear bit the mean.
        void restrictToParent(Tile const& tile)
        {
            if (volume_.container.tile(tile.parentTreeIndex()).isTerminal)
                return; // its values were given
            auto const fine = volume_.channel.tileData(tile.treeIndex());
            float* const coarse = volume_.channel.values(tile.depth - 1).data()
                + static_cast<std::size_t>(tile.parent) * Traits::kVoxelCount;
            IJK const child = tile.childIJK();
            auto const spanAlong = [&](int axis) { return source_.offsetType >> axis & 1 ? 1 : kChildren; };
            int const spanX = spanAlong(0), spanY = spanAlong(1), spanZ = spanAlong(2);
            constexpr int kCovered = Traits::kParentVoxels;
            for (int z = 0; z < kCovered; ++z)
                for (int y = 0; y < kCovered; ++y)
                    for (int x = 0; x < kCovered; ++x) {
                        // As differences: the mean of equal values is that value.
                        float const first = fine(x * kChildren, y * kChildren, z * kChildren);
                        float sum = 0;
                        for (int k = 0; k < spanZ; ++k)
                            for (int j = 0; j < spanY; ++j)
                                for (int i = 0; i < spanX; ++i)
                                    sum += fine(x * kChildren + i, y * kChildren + j, z * kChildren + k) - first;
                        coarse[linearIndex(kSide, child.i * kCovered + x, child.j * kCovered + y,
                            child.k * kCovered + z)] = first + sum / static_cast<float>(spanX * spanY * spanZ);
                    }
        }

        VolumeSource const& source_;
        Volume<Traits> volume_;
        int coarsestTerminal_ = Traits::kDepthCount;
    };

}

template <class Traits> Volume<Traits> buildVolume(VolumeSource const& source)
{
    return Builder<Traits>(source).build();
}

template <class Traits> Channel<Traits, float> makeHaloChannel(Volume<Traits> const& volume)
{
    constexpr std::size_t kHaloCount = PositiveHalo<Traits>::kVoxelCount;
    Channel<Traits, float> padded(Traits::kSide + 1);
    typename Container<Traits>::ConstTileAccessor accessor(volume.container);
    PositiveHalo<Traits> halo, parentHalo;
    for (int depth = volume.channel.coarsestDepth(); depth < Traits::kDepthCount; ++depth) {
        std::vector<float>& values = padded.values(depth);
        values.resize(volume.container.tileCount(depth) * kHaloCount);
        for (std::size_t number = 0; number < volume.container.tileCount(depth); ++number) {
            auto const& tile = volume.container.tile(number, depth);
            typename Container<Traits>::TileType const* parent = nullptr;
            if (depth > volume.channel.coarsestDepth()) {
                parent = &volume.container.tile(tile.parentTreeIndex());
                auto const ofParent = padded.template tileData<Traits::kSide + 1>(parent->treeIndex());
                parentHalo.reset(0);
                std::copy_n(ofParent.values(), kHaloCount, &parentHalo(0));
            }
            setHaloTile<Traits>(tile, parent, volume.channel, parentHalo, 2, accessor, halo);
            std::copy_n(halo.values(), kHaloCount, values.data() + number * kHaloCount);
        }
    }
    return padded;
}

template Volume<Traits2> buildVolume(VolumeSource const& source);
template Volume<Traits5> buildVolume(VolumeSource const& source);
template Channel<Traits2, float> makeHaloChannel(Volume<Traits2> const& volume);
template Channel<Traits5, float> makeHaloChannel(Volume<Traits5> const& volume);

}
