#include "VdbOutline.h"

#include <bit>
#include <map>
#include <tuple>

namespace ModelingProgram {

namespace {

    constexpr std::uint64_t kMagic = 0x56444220;
    constexpr std::uint32_t kOldestFormat = 222, kNewestFormat = 224;
    constexpr std::size_t kUuidBytes = 36;
    constexpr std::string_view kLayout = "_5_4_3"; // of trees: nodes of 32³ and 16³ children, leaves of 8³ voxels

    // Flags for the storage of values.
    constexpr std::uint32_t kZipped = 1, kActiveOnly = 2, kBlosc = 4;

    class VdbScanner final : public Scanner {
    public:
        using Scanner::Scanner;

        template <class T> T number(char const* what)
        {
            require(sizeof(T), what);
            T value;
            std::memcpy(&value, at_, sizeof(T));
            at_ += sizeof(T);
            return value;
        }

        std::string_view bytes(std::uint64_t count, char const* what)
        {
            require(count, what);
            std::string_view const result(at_, count);
            at_ += count;
            return result;
        }

        std::string_view text(char const* what) { return bytes(number<std::uint32_t>(what), what); }

        bool flag(char const* what)
        {
            auto const value = number<unsigned char>(what);
            if (value > 1)
                refuse(std::string(what) + " is neither 0 nor 1");
            return value != 0;
        }

    protected:
        std::string location() const override { return "byte " + std::to_string(position()); }

    private:
        void require(std::uint64_t count, char const* what) const
        {
            if (count > remaining())
                refuse(std::string("the file is cut off or broken: it ends before the end of ") + what);
        }
    };

    struct Metadata {
        bool isHalf = false; // floats are stored in 16 bits
    };

    Metadata skipMetadata(VdbScanner& in)
    {
        Metadata metadata;
        auto const count = in.number<std::uint32_t>("the count of metadata");
        in.requirePossible(count, "metadata", 3 * sizeof(std::uint32_t));
        for (std::uint32_t i = 0; i != count; ++i) {
            std::string_view const name = in.text("the name of a piece of metadata");
            std::string_view const type = in.text("the type of a piece of metadata");
            std::string_view const value = in.text("a piece of metadata");
            // Other types are harmless: they are read as raw bytes or strings.
            if (type != "bool")
                continue;
            if (value.size() != 1 || static_cast<unsigned char>(value[0]) > 1)
                in.refuse("a boolean piece of metadata is neither 0 nor 1");
            if (name == "is_saved_as_half_float")
                metadata.isHalf = value[0] != 0;
        }
        return metadata;
    }

    std::string readableName(std::string_view uniqueName)
    {
        constexpr char kNumberFollows = '\x1e';
        std::size_t const end = uniqueName.find(kNumberFollows);
        if (end == uniqueName.npos)
            return std::string(uniqueName);
        return std::string(uniqueName.substr(0, end)) + "[" + std::string(uniqueName.substr(end + 1)) + "]";
    }

    std::string readableType(std::string_view type)
    {
        constexpr std::string_view kPrefix = "Tree_", kHalf = "_HalfFloat";
        if (type.ends_with(kHalf))
            type.remove_suffix(kHalf.size());
        bool const isUsual = type.starts_with(kPrefix) && type.ends_with(kLayout);
        return std::string(isUsual ? type.substr(kPrefix.size(), type.size() - kPrefix.size() - kLayout.size()) : type);
    }

    VdbGridEntry readEntry(VdbScanner& in)
    {
        VdbGridEntry entry;
        entry.descriptor = in.position();
        entry.uniqueName = in.text("the name of a grid");
        entry.name = readableName(entry.uniqueName);
        entry.type = readableType(in.text("the type of a grid"));
        entry.treeOwner = in.text("the name of the grid whose values a grid shares");
        entry.grid = in.number<std::uint64_t>("the position of a grid");
        in.number<std::uint64_t>("the position of the values of a grid");
        auto const end = in.number<std::uint64_t>("the end of a grid");
        if (entry.grid != in.position() || end < entry.grid)
            in.refuse("the positions stated for a grid are inconsistent");
        in.bytes(end - entry.grid, "the grid");
        return entry;
    }

    /// Walks over the data of a float grid and checks all sizes in it.
    class FloatGridWalk {
    public:
        FloatGridWalk(InputFile const& file, VdbGridEntry const& entry)
            : in_(file, entry.grid)
        {
        }

        VdbGridSize walk(bool ownsTree)
        {
            compression_ = in_.number<std::uint32_t>("how values are compressed");
            if (compression_ > (kZipped | kActiveOnly | kBlosc))
                in_.refuse("the values are compressed in an unknown way");
            isHalf_ = skipMetadata(in_).isHalf;
            skipTransform();
            if (!ownsTree)
                return size_;
            skipRoot();
            size_.treeBytes += leafCount_ * kLeafBytes;
            for (; leafCount_ != 0; --leafCount_) {
                std::uint32_t const active = skipMask(kLeafVoxels, "the mask of a leaf");
                skipValues(active, kLeafVoxels, "the values of a leaf");
                size_.activeVoxels += active;
            }
            return size_;
        }

    private:
        static constexpr std::uint32_t kLeafVoxels = 8 * 8 * 8;
        static constexpr std::uint32_t kUpperChildren = 32 * 32 * 32, kLowerChildren = 16 * 16 * 16;
        // Sizes in the memory of OpenVDB: a leaf with its values, and a node with 8 bytes per child and three masks.
        static constexpr std::uint32_t kLeafBytes = kLeafVoxels * sizeof(float) + 160, kBytesPerChild = 9;

        void skipTransform()
        {
            constexpr std::size_t kVector = 3 * sizeof(double), kMatrix = 16 * sizeof(double);
            static std::map<std::string_view, std::size_t> const bytesOfType{{"AffineMap", kMatrix},
                {"UnitaryMap", kMatrix}, {"TranslationMap", kVector}, {"ScaleMap", 5 * kVector},
                {"UniformScaleMap", 5 * kVector}, {"ScaleTranslateMap", 6 * kVector},
                {"UniformScaleTranslateMap", 6 * kVector}};
            std::string_view const type = in_.text("the type of a transform");
            auto const known = bytesOfType.find(type);
            if (type == "NonlinearFrustumMap")
                in_.refuse("the grid has a frustum transform. Resample it to cubic voxels first");
            if (known == bytesOfType.end())
                in_.refuse("unknown transform " + std::string(type.substr(0, 40)));
            in_.bytes(known->second, "a transform");
        }

        void skipRoot()
        {
            if (in_.number<std::int32_t>("the count of buffers") != 1)
                in_.refuse("the tree has several buffers");
            in_.number<float>("the background");
            auto const tiles = in_.number<std::uint32_t>("the count of tiles");
            auto const children = in_.number<std::uint32_t>("the count of nodes");
            in_.requirePossible(tiles, "tiles", 17);
            for (std::uint32_t tile = 0; tile != tiles; ++tile) {
                in_.bytes(3 * sizeof(std::int32_t) + sizeof(float), "a tile");
                in_.flag("whether a tile is active");
            }
            std::tuple<std::int32_t, std::int32_t, std::int32_t> previous;
            for (std::uint32_t child = 0; child != children; ++child) {
                auto const x = in_.number<std::int32_t>("a node"), y = in_.number<std::int32_t>("a node"),
                           z = in_.number<std::int32_t>("a node");
                constexpr std::int32_t kWidth = 32 * 16 * 8;
                if (x % kWidth != 0 || y % kWidth != 0 || z % kWidth != 0
                    || (child != 0 && previous >= std::tuple(x, y, z)))
                    in_.refuse("a node has an invalid position");
                previous = {x, y, z};
                skipUpperNode();
            }
        }

        void skipUpperNode()
        {
            for (std::uint32_t child = skipNode(kUpperChildren); child != 0; --child) {
                std::uint32_t const leaves = skipNode(kLowerChildren);
                for (std::uint32_t leaf = 0; leaf != leaves; ++leaf)
                    skipMask(kLeafVoxels, "the mask of a leaf");
                leafCount_ += leaves;
            }
        }

        /// \return the number of its children
        std::uint32_t skipNode(std::uint32_t places)
        {
            size_.treeBytes += std::uint64_t{places} * kBytesPerChild;
            std::uint32_t const children = skipMask(places, "the nodes in a node");
            skipValues(skipMask(places, "the active tiles of a node"), places, "the tiles of a node");
            return children;
        }

        /// \return the number of bits set
        std::uint32_t skipMask(std::uint32_t bits, char const* what)
        {
            std::uint32_t count = 0;
            for (char const byte : in_.bytes(bits / 8, what))
                count += static_cast<std::uint32_t>(std::popcount(static_cast<unsigned char>(byte)));
            return count;
        }

        void skipValues(std::uint32_t active, std::uint32_t all, char const* what)
        {
            // How inactive values are stored: as the background, as one or two other values selected by a mask, or all
            // of them.
            enum : unsigned char { OneOther = 2, Mask = 3, MaskAndOne = 4, MaskAndTwo = 5, AllStored = 6 };
            auto const inactive = in_.number<unsigned char>(what);
            if (inactive > AllStored)
                in_.refuse(std::string(what) + " are stored in an unknown way");
            if (inactive == OneOther || inactive == MaskAndOne || inactive == MaskAndTwo)
                in_.bytes((inactive == MaskAndTwo ? 2 : 1) * sizeof(float), what);
            if (inactive == Mask || inactive == MaskAndOne || inactive == MaskAndTwo)
                in_.bytes(all / 8, what);
            std::uint32_t const count = (compression_ & kActiveOnly) != 0 && inactive != AllStored ? active : all;
            if (isHalf_ && count == 0)
                return;
            skipChunk(count * (isHalf_ ? 2 : sizeof(float)), what);
        }

        void skipChunk(std::uint64_t bytes, char const* what)
        {
            if ((compression_ & (kZipped | kBlosc)) == 0) {
                in_.bytes(bytes, what);
                return;
            }
            auto const stored = in_.number<std::int64_t>(what);
            if (stored <= 0) { // uncompressed
                if (stored != -static_cast<std::int64_t>(bytes))
                    in_.refuse(std::string(what) + " have another size than they state");
                in_.bytes(bytes, what);
                return;
            }
            std::string_view const chunk = in_.bytes(static_cast<std::uint64_t>(stored), what);
            if ((compression_ & kBlosc) != 0 && !agrees(chunk, bytes))
                in_.refuse(std::string(what) + " have another size than they state");
        }

        /// Whether the sizes in the header of a Blosc chunk are consistent.
        static bool agrees(std::string_view chunk, std::uint64_t bytes)
        {
            constexpr std::size_t kUnpackedAt = 4, kPackedAt = 12, kHeader = 16;
            if (chunk.size() < kHeader)
                return false;
            std::uint32_t unpacked, packed;
            std::memcpy(&unpacked, chunk.data() + kUnpackedAt, sizeof(unpacked));
            std::memcpy(&packed, chunk.data() + kPackedAt, sizeof(packed));
            return unpacked == bytes && packed == chunk.size();
        }

        VdbScanner in_;
        std::uint32_t compression_ = 0;
        bool isHalf_ = false;
        std::uint64_t leafCount_ = 0;
        VdbGridSize size_;
    };

}

std::vector<VdbGridEntry> readVdbOutline(InputFile const& file)
{
    VdbScanner in(file, 0);
    if (file.size < sizeof(kMagic) || in.number<std::uint64_t>("") != kMagic)
        throw FileError(file.path.string() + " cannot be read: it is not an OpenVDB file");
    auto const format = in.number<std::uint32_t>("the header");
    if (format < kOldestFormat || format > kNewestFormat)
        throw FileError(file.path.string() + " cannot be read: its format is " + std::to_string(format)
            + ", but only 222 to 224 can be read, which OpenVDB has written since 2013");
    in.bytes(2 * sizeof(std::uint32_t), "the header"); // version of the library
    bool const hasPlaces = in.flag("whether grids can be found");
    in.bytes(kUuidBytes, "the header");
    skipMetadata(in);
    if (!hasPlaces)
        in.refuse("the file was written as a stream, without the positions of its grids. Write it as a file");
    auto const count = in.number<std::uint32_t>("the count of grids");
    in.requirePossible(count, "grids", 3 * sizeof(std::uint32_t) + 3 * sizeof(std::uint64_t));
    std::vector<VdbGridEntry> entries;
    for (std::uint32_t grid = 0; grid != count; ++grid)
        entries.push_back(readEntry(in));
    return entries;
}

VdbGridSize checkVdbFloatGrid(InputFile const& file, VdbGridEntry const& entry, std::vector<VdbGridEntry> const& all)
{
    VdbGridSize const size = FloatGridWalk(file, entry).walk(entry.treeOwner.empty());
    if (entry.treeOwner.empty())
        return size;
    auto const owner = std::find_if(
        all.begin(), all.end(), [&](VdbGridEntry const& other) { return other.uniqueName == entry.treeOwner; });
    if (owner == all.end() || owner->type != entry.type || !owner->treeOwner.empty())
        throw FileError(file.path.string() + " cannot be read: grid \"" + entry.name
            + "\" shares the values of a grid that does not exist");
    return FloatGridWalk(file, *owner).walk(true);
}

}
