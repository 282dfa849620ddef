#include "Hdf5File.h"
#include "Hdf5Names.h"
#include "Hdf5Outline.h"
#include "Hdf5Process.h"
#include "Streams.h"
#include "WorkMeter.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <map>
#include <numeric>
#include <set>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <zlib.h>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Common::GeoLocation;
using Tessara::Object;
using Tessara::PropertyValue;
template <class T> using Array = Orvan::Array<T>;

namespace {

    /// Refuses what is wrong at a path in the file.
    struct Place {
        std::filesystem::path const& file;
        std::string path;

        [[noreturn]] void refuse(std::string const& why) const
        {
            throw FileError(file.string() + ", " + (path.empty() ? "/" : path) + ": " + why);
        }
        Place in(std::string_view name) const { return {file, path + "/" + std::string(name)}; }
    };

    /// The file as raw bytes.
    class RawFile {
    public:
        explicit RawFile(std::filesystem::path const& file)
            : descriptor_(::open(regularFileOf(file).c_str(), O_RDONLY | O_CLOEXEC))
        {
            struct stat status = {};
            if (descriptor_ < 0 || ::fstat(descriptor_, &status) != 0)
                fail(file, std::strerror(errno));
            size = static_cast<std::uint64_t>(status.st_size);
        }
        RawFile(RawFile const&) = delete;
        RawFile& operator=(RawFile const&) = delete;
        ~RawFile() { close(); }

        /// \pre  the bytes are inside the file
        void read(std::uint64_t address, void* target, std::uint64_t bytes, Place const& place) const
        {
            auto* to = static_cast<char*>(target);
            while (bytes != 0) {
                ssize_t const count = ::pread(descriptor_, to, bytes, static_cast<off_t>(address));
                if (count < 0 && errno == EINTR)
                    continue;
                if (count <= 0)
                    place.refuse(count < 0 ? std::strerror(errno) : "the file changed while it was read");
                to += count;
                address += static_cast<std::uint64_t>(count);
                bytes -= static_cast<std::uint64_t>(count);
                workMeter.add(static_cast<std::uint64_t>(count));
            }
        }

        bool has(std::uint64_t address, std::uint64_t bytes) const { return bytes <= size && address <= size - bytes; }

        std::uint64_t size = 0;

    private:
        [[noreturn]] void fail(std::filesystem::path const& file, char const* why)
        {
            std::string const message = file.string() + " cannot be read: " + why;
            close();
            throw FileError(message);
        }
        void close() const
        {
            if (descriptor_ >= 0)
                ::close(descriptor_);
        }

        int descriptor_;
    };

    /// The number of scalars, 0 if it does not fit 64 bits.
    std::uint64_t productOf(std::vector<std::uint64_t> const& extents)
    {
        std::uint64_t product = 1;
        for (std::uint64_t const extent : extents)
            if (__builtin_mul_overflow(product, extent, &product))
                return 0;
        return product;
    }

    /// Reads an array that is stored in chunks of up to three dimensions.
    class ChunkReader {
    public:
        ChunkReader(Hdf5Chunks const& chunks, std::uint64_t arrayBytes, RawFile const& file, Place const& place)
            : chunks_(chunks)
            , file_(file)
            , place_(place)
            , scalarBytes_(arrayBytes / productOf(chunks.extents))
            , chunkBytes_(productOf(chunks.chunkExtents) * scalarBytes_)
        {
        }

        void read(std::byte* target)
        {
            std::vector<std::uint64_t> corner(chunks_.extents.size(), 0);
            for (std::size_t chunk = 0; chunk != chunks_.chunks.size(); ++chunk) {
                place(readChunk(chunk), corner, target);
                for (std::size_t i = corner.size(); i-- != 0;) {
                    if ((corner[i] += chunks_.chunkExtents[i]) < chunks_.extents[i])
                        break;
                    corner[i] = 0;
                }
            }
        }

    private:
        std::byte const* readChunk(std::size_t index)
        {
            auto const& [address, bytes, skipped] = chunks_.chunks[index];
            if (!file_.has(address, bytes))
                place_.refuse("chunk " + std::to_string(index) + " is beyond the end of the file");
            stored_.resize(bytes);
            file_.read(address, stored_.data(), bytes, place_);
            for (std::size_t filter = chunks_.filters.size(); filter-- != 0;) {
                if (filter < 64 && (skipped >> filter & 1) != 0)
                    continue;
                if (chunks_.filters[filter] == Hdf5Chunks::Deflate)
                    inflate(index);
                else
                    unshuffle();
                stored_.swap(result_);
            }
            if (stored_.size() != chunkBytes_)
                place_.refuse("chunk " + std::to_string(index) + " has " + std::to_string(stored_.size())
                    + " bytes instead of " + std::to_string(chunkBytes_));
            return stored_.data();
        }

        void inflate(std::size_t index)
        {
            constexpr std::uint64_t kLargestRatio = 1032; // of the method, plus a few bytes
            if (chunkBytes_ / kLargestRatio > stored_.size())
                place_.refuse("chunk " + std::to_string(index) + " declares more bytes than its compressed data hold");
            result_.resize(chunkBytes_);
            uLongf bytes = chunkBytes_;
            int const status = ::uncompress(reinterpret_cast<Bytef*>(result_.data()), &bytes,
                reinterpret_cast<Bytef const*>(stored_.data()), stored_.size());
            if (status == Z_MEM_ERROR)
                throw std::bad_alloc();
            if (status != Z_OK)
                place_.refuse("the compressed data of chunk " + std::to_string(index) + " are broken");
            result_.resize(bytes);
        }

        /// Undoes a transposition: all first bytes of scalars come first, then all second bytes, and so on.
        void unshuffle()
        {
            result_.resize(stored_.size());
            std::size_t const count = stored_.size() / scalarBytes_;
            for (std::size_t byte = 0; byte != scalarBytes_; ++byte)
                for (std::size_t i = 0; i != count; ++i)
                    result_[i * scalarBytes_ + byte] = stored_[byte * count + i];
            std::copy(stored_.begin() + static_cast<std::ptrdiff_t>(count * scalarBytes_), stored_.end(),
                result_.begin() + static_cast<std::ptrdiff_t>(count * scalarBytes_));
        }

        /// Copies the part of a chunk that is inside the array, in runs along the last dimension.
        void place(std::byte const* chunk, std::vector<std::uint64_t> const& corner, std::byte* target) const
        {
            std::size_t const rank = corner.size();
            std::vector<std::uint64_t> counts(rank), at(rank, 0);
            for (std::size_t i = 0; i != rank; ++i)
                counts[i] = std::min(chunks_.chunkExtents[i], chunks_.extents[i] - corner[i]);
            std::size_t run = rank - 1; // the first dimension of which whole rows are contiguous in both
            while (run != 0 && chunks_.chunkExtents[run] == chunks_.extents[run])
                --run;
            std::uint64_t runBytes = scalarBytes_;
            for (std::size_t i = run; i != rank; ++i)
                runBytes *= counts[i];
            for (bool isOver = false; !isOver;) {
                std::uint64_t from = 0, to = 0;
                for (std::size_t i = 0; i != rank; ++i) {
                    from = from * chunks_.chunkExtents[i] + at[i];
                    to = to * chunks_.extents[i] + corner[i] + at[i];
                }
                std::memcpy(target + to * scalarBytes_, chunk + from * scalarBytes_, runBytes);
                isOver = true;
                for (std::size_t i = run; i-- != 0 && isOver;) {
                    isOver = ++at[i] == counts[i];
                    if (isOver)
                        at[i] = 0;
                }
            }
        }

        Hdf5Chunks const& chunks_;
        RawFile const& file_;
        Place const& place_;
        std::uint64_t scalarBytes_;
        std::uint64_t chunkBytes_;
        std::vector<std::byte> stored_, result_;
    };

    // Groups of a "kind", which are read as objects first.

    template <class T> T const& memberOf(Object const& group, char const* name, Place const& place)
    {
        PropertyValue const* const value = group.findProperty(name);
        T const* const member = value ? value->get<T>() : nullptr;
        if (!member)
            place.in(name).refuse("it is missing or has a wrong type");
        return *member;
    }

    template <class T> Array<T> const& arrayOf(Object const& group, char const* name, Place const& place)
    {
        auto const& array = memberOf<Orvan::Ptr<Array<T>>>(group, name, place);
        if (!array)
            place.in(name).refuse("it holds no values");
        return *array;
    }

    bool isEmpty(Object const& group)
    {
        return group.keys()->empty();
    }

    using OnSize = std::function<void(std::uint64_t)>;

    Orvan::Ptr<Array<Orvan::String>> stringsOf(Object const& group, OnSize const& onSize, Place const& place)
    {
        if (isEmpty(group))
            return nullptr;
        auto const& bytes = arrayOf<unsigned char>(group, "bytes", place);
        auto const& offsets = arrayOf<unsigned long long>(group, "offsets", place);
        if (offsets.empty() || offsets[0] != 0 || offsets[offsets.size - 1] != bytes.size)
            place.in("offsets").refuse("the offsets do not go from 0 to the number of bytes");
        auto const* const decrease = std::adjacent_find(offsets.begin(), offsets.end(), std::greater<>());
        if (decrease != offsets.end())
            place.in("offsets").refuse(
                "element " + std::to_string(decrease - offsets.begin() + 1) + " is less than the one before it");
        onSize(offsets.size * sizeof(Orvan::String) + bytes.size);
        auto strings = Orvan::MutablePtr<Array<Orvan::String>>::make(offsets.size - 1);
        for (std::uint64_t i = 0; i != strings->size; ++i)
            (*strings)[i] = Orvan::String(
                std::string_view(reinterpret_cast<char const*>(bytes.data) + offsets[i], offsets[i + 1] - offsets[i]));
        return strings;
    }

    Orvan::Ptr<Array<GeoLocation>> locationsOf(Object const& group, OnSize const& onSize, Place const& place)
    {
        if (isEmpty(group))
            return nullptr;
        auto const& objects = arrayOf<Orvan::String>(group, "object", place);
        auto const& components = arrayOf<Orvan::String>(group, "component", place);
        auto const& elements = arrayOf<unsigned int>(group, "element", place);
        auto const& coordinates = arrayOf<Tessara::Math::float3>(group, "coordinates", place);
        if (components.size != objects.size || elements.size != objects.size || coordinates.size != objects.size)
            place.refuse("its arrays have different lengths");
        onSize(objects.size * sizeof(GeoLocation));
        auto locations = Orvan::MutablePtr<Array<GeoLocation>>::make(objects.size);
        for (std::uint64_t i = 0; i != objects.size; ++i)
            (*locations)[i] = {objects[i], components[i], elements[i], coordinates[i]};
        return locations;
    }

    GeoLocation locationOf(Object const& group, Place const& place)
    {
        return {memberOf<Orvan::String>(group, "object", place), memberOf<Orvan::String>(group, "component", place),
            memberOf<unsigned int>(group, "element", place),
            memberOf<Tessara::Math::float3>(group, "coordinates", place)};
    }

    /// Turns an outline into objects.
    class Reader {
    public:
        Reader(RawFile const& file, std::string_view outline, OnSize const& onSize)
            : file_(file)
            , outline_(outline)
            , onSize_(onSize)
            , rawBytesLeft_(file.size)
        {
        }

        std::vector<Hdf5Object> readAll(Place const& root)
        {
            std::vector<Hdf5Object> objects;
            while (!outline_.atEnd()) {
                Hdf5Record const kind = outline_.kind();
                std::string const name(outline_.text());
                if (kind == Hdf5Record::Refusal)
                    refuseAsOutlined(name, root);
                Place const place = root.in(name);
                std::string remark;
                PropertyValue const value = readValue(kind, place, 0, &remark);
                auto const* const object = value.get<Orvan::Ptr<Object>>();
                if (!object || !*object)
                    place.refuse("it is not an object");
                objects.push_back({name, *object, std::move(remark)});
            }
            return objects;
        }

    private:
        [[noreturn]] void refuseAsOutlined(std::string const& path, Place const& place)
        {
            Place{place.file, path}.refuse(std::string(outline_.text()));
        }

        PropertyValue readValue(Hdf5Record kind, Place const& place, int level, std::string* remark = nullptr)
        {
            switch (kind) {
            case Hdf5Record::Object: {
                std::uint64_t const number = outline_.number();
                return values_[number] = readGroup(place, level, remark);
            }
            case Hdf5Record::Again: {
                auto const value = values_.find(outline_.number());
                if (value == values_.end())
                    throw Hdf5OutlineError();
                return value->second;
            }
            case Hdf5Record::Nothing:
                return {};
            case Hdf5Record::NullObject:
                return Orvan::Ptr<Object>();
            case Hdf5Record::Scalar:
                return readScalar(place);
            case Hdf5Record::NullArray:
            case Hdf5Record::InlineArray:
            case Hdf5Record::ContiguousArray:
            case Hdf5Record::ChunkedArray: {
                std::uint64_t const number = outline_.number();
                return values_[number] = readArray(kind, place);
            }
            case Hdf5Record::Refusal:
            case Hdf5Record::End:
                break;
            }
            throw Hdf5OutlineError();
        }

        PropertyValue readGroup(Place const& place, int level, std::string* remark)
        {
            if (level >= kHdf5MostLevels + 2) // an array of locations has groups of strings
                place.refuse("objects are nested more than " + std::to_string(kHdf5MostLevels) + " levels deep");
            std::string const kind(outline_.text()), note(outline_.text());
            if (remark)
                *remark = note;
            auto object = Tessara::createObject();
            for (;;) {
                Hdf5Record const record = outline_.kind();
                std::string_view const name = outline_.text();
                if (record == Hdf5Record::End)
                    break;
                if (record == Hdf5Record::Refusal)
                    refuseAsOutlined(std::string(name), place);
                Place const inside = place.in(name);
                std::optional<std::string> const key = unescapedName(name);
                if (!key)
                    inside.refuse("in its name, a '%' is not followed by two hexadecimal digits");
                Orvan::String const text{std::string_view(*key)};
                if (object->hasProperty(text))
                    inside.refuse("there is another value of that name, escaped in another way");
                object->setProperty(text, readValue(record, inside, level + 1));
            }
            if (kind.empty())
                return Orvan::Ptr<Object>(std::move(object));
            if (kind == kStrings)
                return stringsOf(*object, onSize_, place);
            if (kind == kLocations)
                return locationsOf(*object, onSize_, place);
            if (kind == kLocation)
                return locationOf(*object, place);
            place.refuse("its attribute \"kind\" is \"" + kind + "\", which is unknown");
        }

        PropertyValue readScalar(Place const& place)
        {
            std::uint64_t const type = outline_.number();
            std::string_view const bytes = outline_.text();
            if (type == kInterpolationType)
                return valueOf<Common::DataInterpolationMode>(bytes, place);
            PropertyValue value;
            bool const isKnown = visitElementType(type, [&]<class T>(ElementType<T>) {
                if constexpr (std::is_same_v<T, Orvan::String>)
                    value = Orvan::String(bytes);
                else if constexpr (!kIsComposed<T>)
                    value = valueOf<T>(bytes, place);
            });
            if (!isKnown || value.empty())
                throw Hdf5OutlineError();
            return value;
        }

        template <class T> static T valueOf(std::string_view bytes, Place const& place)
        {
            T value;
            if (bytes.size() != sizeof(T))
                throw Hdf5OutlineError();
            if constexpr (std::is_same_v<T, bool>)
                requireBooleans(reinterpret_cast<unsigned char const*>(bytes.data()), 1, place);
            std::memcpy(&value, bytes.data(), sizeof(T));
            return value;
        }

        PropertyValue readArray(Hdf5Record kind, Place const& place)
        {
            std::uint64_t const type = outline_.number();
            PropertyValue value;
            bool const isKnown = visitElementType(type, [&]<class T>(ElementType<T>) {
                if constexpr (!kIsComposed<T>)
                    value = kind == Hdf5Record::NullArray ? Orvan::Ptr<Array<T>>() : readElements<T>(kind, place);
            });
            if (!isKnown || value.empty())
                throw Hdf5OutlineError();
            return value;
        }

        template <class T> Orvan::Ptr<Array<T>> readElements(Hdf5Record kind, Place const& place)
        {
            std::uint64_t const count = outline_.number();
            std::uint64_t bytes;
            if (__builtin_mul_overflow(count, std::uint64_t{sizeof(T)}, &bytes))
                place.refuse("it declares " + std::to_string(count) + " elements, which no memory can hold");
            Hdf5Chunks chunks;
            std::uint64_t address = 0;
            std::string_view content;
            if (kind == Hdf5Record::InlineArray) {
                content = outline_.text();
                if (content.size() != bytes)
                    throw Hdf5OutlineError();
            } else if (kind == Hdf5Record::ContiguousArray) {
                address = outline_.number();
                if (!file_.has(address, bytes))
                    place.refuse("it declares " + std::to_string(count) + " elements, but the file ends before");
            } else {
                chunks = readChunks(count, bytes, place);
            }
            if (kind != Hdf5Record::ChunkedArray || chunks.filters.empty())
                spend(bytes, place);
            if (bytes >= kLargeBytes)
                onSize_(bytes);

            auto array = Orvan::MutablePtr<Array<T>>::make(count, Orvan::kUninitialized);
            auto* const target = reinterpret_cast<std::byte*>(array->data);
            if (kind == Hdf5Record::ContiguousArray)
                file_.read(address, target, bytes, place);
            else if (kind == Hdf5Record::ChunkedArray)
                ChunkReader(chunks, bytes, file_, place).read(target);
            else if (bytes != 0)
                std::memcpy(target, content.data(), bytes);
            if constexpr (std::is_same_v<T, bool>)
                requireBooleans(reinterpret_cast<unsigned char const*>(target), count, place);
            return array;
        }

        Hdf5Chunks readChunks(std::uint64_t count, std::uint64_t bytes, Place const& place)
        {
            Hdf5Chunks chunks = outline_.chunks();
            std::uint64_t const scalars = productOf(chunks.extents), chunkScalars = productOf(chunks.chunkExtents);
            bool const isPossible = count != 0 && !chunks.extents.empty() && chunks.extents.size() <= 3
                && chunks.extents[0] == count && chunks.chunkExtents.size() == chunks.extents.size() && scalars != 0
                && bytes % scalars == 0 && chunkScalars != 0;
            std::vector<std::uint64_t> grid;
            for (std::size_t i = 0; isPossible && i != chunks.extents.size(); ++i)
                grid.push_back((chunks.extents[i] - 1) / chunks.chunkExtents[i] + 1);
            if (!isPossible || chunks.chunks.size() != productOf(grid))
                throw Hdf5OutlineError();
            std::uint64_t const scalarBytes = bytes / scalars;
            if (chunkScalars > kMostChunkBytes / scalarBytes)
                place.refuse("its chunks are larger than 4 GiB");
            if (chunkScalars * scalarBytes >= kLargeBytes)
                onSize_(bytes + chunkScalars * scalarBytes);
            return chunks;
        }

        /// Arrays that are not compressed do not overlap in the file.
        void spend(std::uint64_t bytes, Place const& place)
        {
            if (bytes > rawBytesLeft_)
                place.refuse("the arrays up to this one declare more bytes than the file has");
            rawBytesLeft_ -= bytes;
        }

        static void requireBooleans(unsigned char const* values, std::uint64_t count, Place const& place)
        {
            auto const* const wrong =
                std::find_if(values, values + count, [](unsigned char value) { return value > 1; });
            if (wrong != values + count)
                place.refuse("element " + std::to_string(wrong - values) + " is " + std::to_string(*wrong)
                    + ", neither true nor false");
        }

        static constexpr std::uint64_t kLargeBytes = 1 << 20;
        static constexpr std::uint64_t kMostChunkBytes = std::uint64_t{1} << 32; // as the library allows

        RawFile const& file_;
        Hdf5OutlineReader outline_;
        OnSize onSize_;
        std::uint64_t rawBytesLeft_;
        std::map<std::uint64_t, PropertyValue> values_; // by their number in the outline
    };

}

std::vector<Hdf5Object> readOutlinedObjects(
    std::string_view outline, std::filesystem::path const& file, std::function<void(std::uint64_t)> const& onSize)
{
    RawFile const raw(file);
    try {
        return Reader(
            raw, outline, onSize ? onSize : [](std::uint64_t) {})
            .readAll({file, ""});
    } catch (Hdf5OutlineError const& error) {
        throw FileError(file.string() + " cannot be read: " + error.what());
    }
}

std::vector<Hdf5Object> readHdf5Objects(std::filesystem::path const& file, Hdf5Selection selection,
    std::string const& name, std::function<void(std::uint64_t)> const& onSize)
{
    std::uint64_t const fileBytes = RawFile(file).size;
    return readOutlinedObjects(outlineOf(file, selection, name, fileBytes), file, onSize);
}

}
