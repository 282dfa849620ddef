#include "Hdf5Codec.h"
#include "Hdf5Driver.h"
#include "Hdf5Names.h"
#include "Hdf5Types.h"

#include <algorithm>
#include <map>

#include <cerrno>
#include <cstring>
#include <unistd.h>

namespace ModelingProgram {

using namespace Tessara::Geometry;

void Hdf5OutlineWriter::flush()
{
    for (std::string_view rest = bytes_; !rest.empty();) {
        ssize_t const written = ::write(descriptor_, rest.data(), rest.size());
        if (written < 0 && errno != EINTR)
            throw std::runtime_error(std::strerror(errno));
        rest.remove_prefix(static_cast<std::size_t>(std::max<ssize_t>(written, 0)));
    }
    bytes_.clear();
}

namespace {

    struct Refusal {
        std::string path;
        std::string why;
    };

    [[noreturn]] void refuse(std::string const& path, std::string const& why)
    {
        throw Refusal{path, why};
    }

    struct Link {
        std::string name;
        H5L_type_t type;
    };

    /// The links of a group, in the order of their creation if the file knows it, otherwise sorted by name.
    std::vector<Link> linksOf(hid_t group, hid_t creationProperties)
    {
        unsigned int order = 0;
        checked(H5Pget_link_creation_order(creationProperties, &order));
        std::vector<Link> links;
        auto const add = [](hid_t, char const* name, H5L_info_t const* info, void* list) -> herr_t {
            static_cast<std::vector<Link>*>(list)->push_back({name, info->type});
            return 0;
        };
        checked(H5Literate(group, (order & H5P_CRT_ORDER_TRACKED) != 0 ? H5_INDEX_CRT_ORDER : H5_INDEX_NAME,
            H5_ITER_INC, nullptr, add, &links));
        return links;
    }

    std::vector<hsize_t> extentsOf(hid_t space)
    {
        std::vector<hsize_t> extents(static_cast<std::size_t>(checked(H5Sget_simple_extent_ndims(space))));
        if (!extents.empty())
            checked(H5Sget_simple_extent_dims(space, extents.data(), nullptr));
        return extents;
    }

    /// "float32 with 5 numbers per element" would need all of numpy's names; the class is enough to find the mistake.
    std::string nameOfClass(hid_t type)
    {
        switch (H5Tget_class(type)) {
        case H5T_INTEGER:
            return "integers of " + std::to_string(8 * H5Tget_size(type)) + " bits";
        case H5T_FLOAT:
            return "floating-point numbers of " + std::to_string(8 * H5Tget_size(type)) + " bits";
        case H5T_STRING:
            return "strings";
        case H5T_COMPOUND:
            return "records";
        case H5T_ENUM:
            return "an enumeration";
        default:
            return "another type";
        }
    }

    class Describer {
    public:
        explicit Describer(int pipe)
            : out_(pipe)
        {
        }

        /// Ends the outline with a refusal if the file is not in order.
        void describe(char const* file, Hdf5Selection selection, std::string const& name)
        {
            try {
                open(file);
                describeSelected(selection, name);
            } catch (Refusal const& refusal) {
                describeRefusal(refusal.path, refusal.why);
            } catch (Hdf5Error const& error) {
                describeRefusal(path_, error.what());
            }
            out_.flush();
        }

    private:
        void open(char const* file)
        {
            Hdf5Properties const access(H5Pcreate(H5P_FILE_ACCESS));
            useDescriptors(access);
            checked(H5Pset_file_locking(access, false, true));
            file_ = Hdf5FileHandle(H5Fopen(file, H5F_ACC_RDONLY, access));
            hsize_t userBytes = 0;
            Hdf5Properties const creation(H5Fget_create_plist(file_));
            checked(H5Pget_userblock(creation, &userBytes));
            if (userBytes != 0)
                refuse("/", "the file begins with a block of other data");
            checked(H5Fget_filesize(file_, &fileBytes_));
            requireLayout();
        }

        void describeSelected(Hdf5Selection selection, std::string const& name)
        {
            Hdf5Group const root(H5Gopen2(file_, "/", H5P_DEFAULT));
            Hdf5Properties const creation(H5Gget_create_plist(root));
            std::vector<Link> const links = linksOf(root, creation);
            requireSelected(selection, name, links);
            for (Link const& link : links)
                if (selection != Hdf5Selection::Named || link.name == name)
                    describeLink(root, "", link, 0);
        }

        void describeRefusal(std::string const& path, std::string const& why)
        {
            out_.begin(Hdf5Record::Refusal, path);
            out_.text(why);
        }

        void requireLayout()
        {
            if (checked(H5Aexists(file_, kLayoutAttribute)) == 0)
                refuse("/", std::string("there is no attribute \"") + kLayoutAttribute + "\"");
            Hdf5Attribute const attribute(H5Aopen(file_, kLayoutAttribute, H5P_DEFAULT));
            Hdf5Space const space(H5Aget_space(attribute));
            Hdf5Type const type(H5Aget_type(attribute));
            int version = 0;
            if (H5Tget_class(type) != H5T_INTEGER || H5Sget_simple_extent_npoints(space) != 1)
                refuse("/", std::string("the attribute \"") + kLayoutAttribute + "\" is not one integer");
            checked(H5Aread(attribute, H5T_NATIVE_INT, &version));
            if (version != kLayoutVersion)
                refuse("/",
                    std::string("the attribute \"") + kLayoutAttribute + "\" is " + std::to_string(version)
                        + "; only version " + std::to_string(kLayoutVersion) + " is known");
        }

        static void requireSelected(Hdf5Selection selection, std::string const& name, std::vector<Link> const& links)
        {
            constexpr std::size_t kMostNames = 10;
            std::string names;
            for (std::size_t i = 0; i != std::min(links.size(), kMostNames); ++i)
                names += (i == 0 ? "" : ", ") + links[i].name;
            if (links.size() > kMostNames)
                names += ", ...";
            auto const has = [&](Link const& link) { return link.name == name; };
            if (selection == Hdf5Selection::Named && std::none_of(links.begin(), links.end(), has))
                refuse("/", "there is no object \"" + name + "\", but there are these: " + names);
            if (selection == Hdf5Selection::Only && links.size() != 1)
                refuse("/",
                    links.empty() ? "there is no object"
                                  : "there are " + std::to_string(links.size()) + " objects: " + names
                            + "; a '#' and a name after the name of the file choose one");
        }

        void describeLink(hid_t parent, std::string const& parentPath, Link const& link, int level)
        {
            std::string const path = parentPath + "/" + link.name;
            path_ = path;
            if (link.type != H5L_TYPE_HARD)
                refuse(path, "it is a soft or an external link; only hard links are followed");
            Hdf5AnyObject const object(H5Oopen(parent, link.name.c_str(), H5P_DEFAULT));
            H5O_info_t info;
            checked(H5Oget_info2(object, &info, H5O_INFO_BASIC));
            if (level == 0 && info.type != H5O_TYPE_GROUP)
                refuse(path, "it is not a group; the root of the file holds objects only");
            auto const [entry, isNew] = numbers_.try_emplace(info.addr, Numbered{numbers_.size(), false});
            if (!isNew) {
                if (!entry->second.isComplete)
                    refuse(path, "this object contains itself");
                out_.begin(Hdf5Record::Again, link.name);
                out_.number(entry->second.number);
                return;
            }
            std::uint64_t const number = entry->second.number;
            if (info.type == H5O_TYPE_GROUP)
                describeGroup(object, path, link.name, number, level + 1);
            else if (info.type == H5O_TYPE_DATASET)
                describeDataset(object, path, link.name, number);
            else
                refuse(path, "it is neither a group nor a dataset");
            entry->second.isComplete = true; // references to entries of a map remain valid
        }

        void describeGroup(
            hid_t group, std::string const& path, std::string const& name, std::uint64_t number, int level)
        {
            if (level > 2 * kHdf5MostLevels) // the reader counts those of objects
                refuse(path, "groups are nested too deep");
            Hdf5Properties const creation(H5Gget_create_plist(group));
            std::string const kind = textOf(group, "kind", path), remark = textOf(group, "remark", path);
            out_.begin(Hdf5Record::Object, name);
            out_.number(number);
            out_.text(kind);
            out_.text(remark);
            for (Link const& link : linksOf(group, creation))
                describeLink(group, path, link, level);
            out_.begin(Hdf5Record::End, "");
        }

        /// The text of an attribute; empty if there is none.
        std::string textOf(hid_t object, char const* name, std::string const& path)
        {
            if (checked(H5Aexists(object, name)) == 0)
                return {};
            Hdf5Attribute const attribute(H5Aopen(object, name, H5P_DEFAULT));
            Hdf5Space const space(H5Aget_space(attribute));
            Hdf5Type const type(H5Aget_type(attribute));
            if (H5Tget_class(type) != H5T_STRING || H5Sget_simple_extent_npoints(space) != 1)
                refuse(path, std::string("the attribute \"") + name + "\" is not a string");
            return readText(type, path, [&](void* bytes) { checked(H5Aread(attribute, type, bytes)); });
        }

        template <class Read> std::string readText(hid_t type, std::string const& path, Read const& read)
        {
            if (checked(H5Tis_variable_str(type)) > 0) {
                char* characters = nullptr;
                read(&characters);
                std::string const text = characters ? characters : "";
                H5free_memory(characters);
                return text;
            }
            std::string text(possible(H5Tget_size(type), path), '\0');
            read(text.data());
            if (H5Tget_strpad(type) == H5T_STR_NULLTERM)
                text.resize(std::min(text.size(), text.find('\0')));
            return text;
        }

        std::size_t possible(std::size_t bytes, std::string const& path) const
        {
            if (bytes > fileBytes_)
                refuse(path, "it declares " + std::to_string(bytes) + " bytes, more than the file has");
            return bytes;
        }

        void describeDataset(hid_t dataset, std::string const& path, std::string const& name, std::uint64_t number)
        {
            Hdf5Properties const creation(H5Dget_create_plist(dataset));
            H5D_layout_t const layout = H5Pget_layout(creation);
            if ((layout != H5D_COMPACT && layout != H5D_CONTIGUOUS && layout != H5D_CHUNKED)
                || checked(H5Pget_external_count(creation)) != 0)
                refuse(path, "its values are in other files");
            Hdf5Space const space(H5Dget_space(dataset));
            Hdf5Type const type(H5Dget_type(dataset));
            switch (H5Sget_simple_extent_type(space)) {
            case H5S_NULL:
                describeAbsence(type, path, name, number);
                return;
            case H5S_SCALAR:
                describeScalar(dataset, type, path, name);
                return;
            default:
                describeArray(dataset, creation, type, path, name, number);
            }
        }

        void describeAbsence(hid_t type, std::string const& path, std::string const& name, std::uint64_t number)
        {
            if (H5Tget_class(type) == H5T_STRING) { // the empty string
                out_.begin(Hdf5Record::Scalar, name);
                out_.number(elementTypeNumber<Orvan::String>());
                out_.text("");
            } else if (checked(H5Tequal(type, nothing_)) > 0) {
                out_.begin(Hdf5Record::Nothing, name);
            } else if (checked(H5Tequal(type, nullObject_)) > 0) {
                out_.begin(Hdf5Record::NullObject, name);
            } else {
                out_.begin(Hdf5Record::NullArray, name);
                out_.number(number);
                out_.number(typeOfElement(type, path));
            }
        }

        void describeScalar(hid_t dataset, hid_t type, std::string const& path, std::string const& name)
        {
            auto const read = [&](void* bytes) {
                checked(H5Dread(dataset, type, H5S_ALL, H5S_ALL, H5P_DEFAULT, bytes));
            };
            bool const isText = H5Tget_class(type) == H5T_STRING;
            std::uint64_t const element = isText              ? elementTypeNumber<Orvan::String>()
                : checked(H5Tequal(type, interpolation_)) > 0 ? kInterpolationType
                                                              : typeOfElement(type, path);
            std::string bytes;
            if (isText) {
                bytes = readText(type, path, read);
            } else {
                bytes.resize(possible(H5Tget_size(type), path));
                read(bytes.data());
            }
            out_.begin(Hdf5Record::Scalar, name);
            out_.number(element);
            out_.text(bytes);
        }

        // Records are begun when all of their contents are known, because a refusal is a record too.

        void describeArray(hid_t dataset, hid_t creation, hid_t type, std::string const& path, std::string const& name,
            std::uint64_t number)
        {
            std::vector<hsize_t> const extents = extentsOf(Hdf5Space(H5Dget_space(dataset)));
            std::uint64_t const element = typeOfElements(type, extents, path);
            H5D_layout_t const layout = H5Pget_layout(creation);
            auto const begin = [&](Hdf5Record kind) {
                out_.begin(kind, name);
                out_.number(number);
                out_.number(element);
                out_.number(extents[0]);
            };
            if (layout == H5D_COMPACT || extents[0] == 0) {
                std::string const bytes = extents[0] == 0 ? "" : bytesOf(dataset, type, path);
                begin(Hdf5Record::InlineArray);
                out_.text(bytes);
            } else if (layout == H5D_CONTIGUOUS) {
                std::uint64_t const address = addressOf(dataset, path);
                begin(Hdf5Record::ContiguousArray);
                out_.number(address);
            } else {
                Hdf5Chunks const chunks = chunksOf(dataset, creation, extents, path);
                begin(Hdf5Record::ChunkedArray);
                out_.chunks(chunks);
            }
        }

        /// The values of a compact dataset, which are part of the structure and at most 64 KiB.
        std::string bytesOf(hid_t dataset, hid_t type, std::string const& path) const
        {
            Hdf5Space const space(H5Dget_space(dataset));
            std::string bytes(possible(H5Dget_storage_size(dataset), path), '\0');
            if (bytes.size() != static_cast<std::uint64_t>(H5Sget_simple_extent_npoints(space)) * H5Tget_size(type))
                refuse(path, "its values do not match its length");
            checked(H5Dread(dataset, type, H5S_ALL, H5S_ALL, H5P_DEFAULT, bytes.data()));
            return bytes;
        }

        static std::uint64_t addressOf(hid_t dataset, std::string const& path)
        {
            haddr_t const address = H5Dget_offset(dataset);
            if (address == HADDR_UNDEF)
                refuse(path, "the file does not hold its values");
            return address;
        }

        static Hdf5Chunks chunksOf(
            hid_t dataset, hid_t creation, std::vector<hsize_t> const& extents, std::string const& path)
        {
            std::vector<hsize_t> chunkExtents(extents.size());
            auto const rank = static_cast<int>(extents.size());
            if (checked(H5Pget_chunk(creation, rank, chunkExtents.data())) != rank)
                refuse(path, "its chunks have another number of dimensions");
            // Chunks are counted first, because the extents of a broken file could declare any number of them.
            hsize_t stored = 0, declared = 1;
            Hdf5Space const space(H5Dget_space(dataset));
            checked(H5Dget_num_chunks(dataset, space, &stored));
            for (std::size_t i = 0; i != extents.size(); ++i) {
                hsize_t const along = chunkExtents[i] == 0 ? 0 : (extents[i] - 1) / chunkExtents[i] + 1;
                declared = along != 0 && declared <= stored / along ? declared * along : stored + 1;
            }
            if (declared != stored)
                refuse(path, "the file does not hold all of its chunks");
            Hdf5Chunks chunks;
            chunks.extents.assign(extents.begin(), extents.end());
            chunks.chunkExtents.assign(chunkExtents.begin(), chunkExtents.end());
            chunks.filters = filtersOf(creation, path);
            std::vector<hsize_t> corner(extents.size(), 0);
            for (hsize_t chunk = 0; chunk != stored; ++chunk) {
                chunks.chunks.push_back(chunkAt(dataset, corner));
                for (std::size_t i = corner.size(); i-- != 0;) {
                    if ((corner[i] += chunkExtents[i]) < extents[i])
                        break;
                    corner[i] = 0;
                }
            }
            return chunks;
        }

        static std::vector<std::uint64_t> filtersOf(hid_t creation, std::string const& path)
        {
            std::vector<std::uint64_t> filters;
            int const count = checked(H5Pget_nfilters(creation));
            for (int i = 0; i != count; ++i) {
                unsigned int flags = 0, parameters[1] = {};
                std::size_t parameterCount = 1;
                char name[64] = {};
                H5Z_filter_t const filter = checked(H5Pget_filter2(creation, static_cast<unsigned int>(i), &flags,
                    &parameterCount, parameters, sizeof(name) - 1, name, nullptr));
                if (filter != Hdf5Chunks::Deflate && filter != Hdf5Chunks::Shuffle)
                    refuse(path,
                        "it is stored with the filter " + std::to_string(filter) + " (" + name
                            + "); only gzip and shuffle are read");
                filters.push_back(static_cast<std::uint64_t>(filter));
            }
            return filters;
        }

        static Hdf5Chunks::Chunk chunkAt(hid_t dataset, std::vector<hsize_t> const& corner)
        {
            unsigned int skipped = 0;
            haddr_t address = HADDR_UNDEF;
            hsize_t bytes = 0;
            checked(H5Dget_chunk_info_by_coord(dataset, corner.data(), &skipped, &address, &bytes));
            return {address, bytes, skipped};
        }

        std::uint64_t typeOfElement(hid_t type, std::string const& path) const
        {
            for (Known const& known : known_)
                if (checked(H5Tequal(type, known.whole)) > 0)
                    return known.number;
            refuseType(type, path);
        }

        std::uint64_t typeOfElements(hid_t type, std::vector<hsize_t> const& extents, std::string const& path) const
        {
            for (Known const& known : known_)
                if (std::equal(extents.begin() + 1, extents.end(), known.type.extents.begin(), known.type.extents.end())
                    && checked(H5Tequal(type, known.type.scalar)) > 0)
                    return known.number;
            refuseType(type, path);
        }

        [[noreturn]] static void refuseType(hid_t type, std::string const& path)
        {
            refuse(path, "it holds " + nameOfClass(type) + " in a shape or an order of bytes that no element type has");
        }

        struct Known {
            std::uint64_t number;
            Hdf5ElementType type;
            Hdf5Type whole;
        };

        static std::vector<Known> knownTypes()
        {
            std::vector<Known> result;
            forEachElementTypeName([&]<class T>(ElementType<T>) {
                if constexpr (!kIsComposed<T>) {
                    Hdf5ElementType type = hdf5ElementType<T>();
                    Hdf5Type whole = type.whole();
                    result.push_back({elementTypeNumber<T>(), std::move(type), std::move(whole)});
                }
            });
            return result;
        }

        struct Numbered {
            std::uint64_t number;
            bool isComplete;
        };

        Hdf5OutlineWriter out_;
        Hdf5FileHandle file_;
        hsize_t fileBytes_ = 0;
        std::string path_ = "/"; // of what is being described
        std::vector<Known> known_ = knownTypes();
        Hdf5Type nothing_ = hdf5Absent(kNothing);
        Hdf5Type nullObject_ = hdf5Absent(kNullObject);
        Hdf5Type interpolation_ = hdf5Interpolation();
        std::map<haddr_t, Numbered> numbers_; // by the addresses of what has been described
    };

}

void modelingDescribeHdf5(char const* file, Hdf5Selection selection, char const* name, int pipe)
{
    silenceHdf5();
    H5PLset_loading_state(0); // a file cannot make the library load a filter
    Describer(pipe).describe(file, selection, name);
}

}
