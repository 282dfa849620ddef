#include "Hdf5Codec.h"
#include "Hdf5Driver.h"
#include "Hdf5Names.h"
#include "Hdf5Types.h"

#include <algorithm>
#include <map>
#include <typeinfo>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Common::GeoLocation;
using Tessara::Object;
using Tessara::PropertyValue;
template <class T> using Array = Orvan::Array<T>;

namespace {

    constexpr std::uint64_t kChunkBytes = 1 << 20;
    constexpr std::uint64_t kLeastCompressedBytes = 1 << 12; // smaller arrays do not gain anything
    constexpr std::size_t kMostCompactBytes = 1 << 12; // HDF5 allows almost 64 KiB

    // Strings and records with strings become objects of arrays, which the file holds as groups with a "kind".

    Object objectOf(Array<Orvan::String> const& strings)
    {
        auto offsets = Orvan::MutablePtr<Array<unsigned long long>>::make(strings.size + 1);
        for (std::uint64_t i = 0; i != strings.size; ++i)
            (*offsets)[i + 1] = (*offsets)[i] + strings[i].view().size();
        auto bytes = Orvan::MutablePtr<Array<unsigned char>>::make((*offsets)[strings.size], Orvan::kUninitialized);
        for (std::uint64_t i = 0; i != strings.size; ++i)
            std::copy_n(strings[i].view().data(), strings[i].view().size(), bytes->data + (*offsets)[i]);
        Object result;
        result.setProperty("bytes", Orvan::Ptr<Array<unsigned char>>(std::move(bytes)));
        result.setProperty("offsets", Orvan::Ptr<Array<unsigned long long>>(std::move(offsets)));
        return result;
    }

    template <class T, class Member> Orvan::Ptr<Array<T>> membersOf(Array<GeoLocation> const& locations, Member member)
    {
        auto values = Orvan::MutablePtr<Array<T>>::make(locations.size);
        std::transform(locations.begin(), locations.end(), values->begin(), member);
        return values;
    }

    Object objectOf(Array<GeoLocation> const& locations)
    {
        Object result;
        result.setProperty("object", membersOf<Orvan::String>(locations, std::mem_fn(&GeoLocation::object)));
        result.setProperty("component", membersOf<Orvan::String>(locations, std::mem_fn(&GeoLocation::component)));
        result.setProperty("element", membersOf<unsigned int>(locations, std::mem_fn(&GeoLocation::element)));
        result.setProperty(
            "coordinates", membersOf<Tessara::Math::float3>(locations, std::mem_fn(&GeoLocation::coordinates)));
        return result;
    }

    Object objectOf(GeoLocation const& location)
    {
        Object result;
        result.setProperty("object", Orvan::String(location.object));
        result.setProperty("component", Orvan::String(location.component));
        result.setProperty("element", location.element);
        result.setProperty("coordinates", location.coordinates);
        return result;
    }

    void addText(hid_t object, char const* name, std::string const& text)
    {
        Hdf5Type const type = hdf5Text(std::max<std::size_t>(text.size(), 1));
        Hdf5Space const space(H5Screate(H5S_SCALAR));
        Hdf5Attribute const attribute(H5Acreate2(object, name, type, space, H5P_DEFAULT, H5P_DEFAULT));
        checked(H5Awrite(attribute, type, text.empty() ? "" : text.data()));
    }

    /// Writes the values of objects below a file's root. Paths name the places in the file.
    class Writer {
    public:
        Writer(hid_t file, unsigned int compression)
            : file_(file)
            , compression_(compression)
            , linkProperties_(H5Pcreate(H5P_LINK_CREATE))
        {
            checked(H5Pset_char_encoding(linkProperties_, H5T_CSET_UTF8));
        }

        /// \param kind  of a group that is not an object, but made of temporary values; null for an object
        Hdf5Group writeGroup(hid_t parent, std::string const& path, Object const& object, char const* kind, int level)
        {
            if (level > kHdf5MostLevels)
                refuse(path, "objects are nested more than " + std::to_string(kHdf5MostLevels) + " levels deep");
            Hdf5Group group = createGroup(parent, path);
            bool const wasTemporary = std::exchange(isTemporary_, kind != nullptr);
            if (kind)
                addText(group, "kind", kind);
            Orvan::Ptr<Array<Orvan::String>> const keys = object.keys();
            for (Orvan::String const& key : *keys)
                writeValue(group, path + "/" + escapedName(key.view()), object.getProperty(key), level);
            isTemporary_ = wasTemporary;
            return group;
        }

    private:
        [[noreturn]] static void refuse(std::string const& path, std::string const& why)
        {
            throw std::runtime_error(path + ": " + why);
        }

        static char const* nameIn(std::string const& path) { return path.c_str() + path.rfind('/') + 1; }

        /// Keeps the order of its members.
        Hdf5Group createGroup(hid_t parent, std::string const& path)
        {
            Hdf5Properties const properties(H5Pcreate(H5P_GROUP_CREATE));
            checked(H5Pset_link_creation_order(properties, H5P_CRT_ORDER_TRACKED | H5P_CRT_ORDER_INDEXED));
            checked(H5Pset_obj_track_times(properties, false)); // equal objects give equal files
            return Hdf5Group(H5Gcreate2(parent, nameIn(path), linkProperties_, properties, H5P_DEFAULT));
        }

        void writeValue(hid_t parent, std::string const& path, PropertyValue const& value, int level)
        {
            bool isKnown = true;
            if (value.empty())
                writeAbsence(parent, path, hdf5Absent(kNothing));
            else if (auto const* const object = value.get<Orvan::Ptr<Object>>())
                writeObject(parent, path, *object, level);
            else if (auto const* const mode = value.get<Common::DataInterpolationMode>())
                writeScalar(parent, path, hdf5Interpolation(), mode, sizeof(*mode));
            else
                isKnown = writeTyped(parent, path, value, level);
            if (!isKnown)
                refuse(path, std::string("HDF5 files hold no values of the type ") + value.type().name());
        }

        void writeObject(hid_t parent, std::string const& path, Orvan::Ptr<Object> const& object, int level)
        {
            if (!object)
                writeAbsence(parent, path, hdf5Absent(kNullObject));
            else if (!linkAgain(parent, path, object.get()))
                writeGroup(parent, path, *object, nullptr, level + 1);
        }

        bool writeTyped(hid_t parent, std::string const& path, PropertyValue const& value, int level)
        {
            bool isWritten = false;
            forEachElementTypeName([&]<class T>(ElementType<T>) {
                if (isWritten)
                    return;
                auto const* const array = value.get<Orvan::Ptr<Array<T>>>();
                T const* const single = value.get<T>();
                if (array && (!*array || !linkAgain(parent, path, array->get())))
                    writeArray(parent, path, *array, level);
                else if (single)
                    writeSingle(parent, path, *single, level);
                isWritten = array || single;
            });
            return isWritten;
        }

        template <class T> void writeSingle(hid_t parent, std::string const& path, T const& value, int level)
        {
            if constexpr (std::is_same_v<T, GeoLocation>) {
                writeGroup(parent, path, objectOf(value), kLocation, level);
            } else if constexpr (std::is_same_v<T, Orvan::String>) {
                std::string_view const text = value.view();
                if (text.empty())
                    writeAbsence(parent, path, hdf5Text(1));
                else
                    writeScalar(parent, path, hdf5Text(text.size()), text.data(), text.size());
            } else {
                writeScalar(parent, path, hdf5ElementType<T>().whole(), &value, sizeof(T));
            }
        }

        template <class T>
        void writeArray(hid_t parent, std::string const& path, Orvan::Ptr<Array<T>> const& array, int level)
        {
            if constexpr (kIsComposed<T>) {
                char const* const kind = std::is_same_v<T, GeoLocation> ? kLocations : kStrings;
                writeGroup(parent, path, array ? objectOf(*array) : Object(), kind, level);
            } else {
                Hdf5ElementType const type = hdf5ElementType<T>();
                if (array)
                    writeElements(parent, path, type, array->data, array->size, sizeof(T));
                else
                    writeAbsence(parent, path, type.whole());
            }
        }

        /// Adds a second link to what has been written. Remembers the path and returns false if it has not been.
        bool linkAgain(hid_t parent, std::string const& path, void const* value)
        {
            if (isTemporary_) // the next value may have the same address
                return false;
            auto const [entry, isNew] = paths_.try_emplace(value, path);
            if (!isNew)
                checked(
                    H5Lcreate_hard(file_, entry->second.c_str(), parent, nameIn(path), linkProperties_, H5P_DEFAULT));
            return !isNew;
        }

        Hdf5Dataset createDataset(hid_t parent, std::string const& path, hid_t type, hid_t space, hid_t properties)
        {
            checked(H5Pset_obj_track_times(properties, false));
            checked(H5Pset_fill_time(properties, H5D_FILL_TIME_NEVER)); // all values are written
            return Hdf5Dataset(H5Dcreate2(parent, nameIn(path), type, space, linkProperties_, properties, H5P_DEFAULT));
        }

        void writeAbsence(hid_t parent, std::string const& path, Hdf5Type const& type)
        {
            Hdf5Properties const properties(H5Pcreate(H5P_DATASET_CREATE));
            createDataset(parent, path, type, Hdf5Space(H5Screate(H5S_NULL)), properties);
        }

        void writeScalar(
            hid_t parent, std::string const& path, Hdf5Type const& type, void const* value, std::size_t bytes)
        {
            Hdf5Properties const properties(H5Pcreate(H5P_DATASET_CREATE));
            if (bytes <= kMostCompactBytes)
                checked(H5Pset_layout(properties, H5D_COMPACT));
            Hdf5Space const space(H5Screate(H5S_SCALAR));
            Hdf5Dataset const dataset = createDataset(parent, path, type, space, properties);
            checked(H5Dwrite(dataset, type, H5S_ALL, H5S_ALL, H5P_DEFAULT, value));
        }

        /// The types in the file and in memory are the same, so the library writes the memory as it is.
        void writeElements(hid_t parent, std::string const& path, Hdf5ElementType const& type, void const* values,
            std::uint64_t count, std::uint64_t elementBytes)
        {
            std::vector<hsize_t> extents = type.extents;
            extents.insert(extents.begin(), count);
            auto const rank = static_cast<int>(extents.size());
            Hdf5Space const space(H5Screate_simple(rank, extents.data(), nullptr));
            Hdf5Properties const properties(H5Pcreate(H5P_DATASET_CREATE));
            if (compression_ != 0 && count * elementBytes >= kLeastCompressedBytes) {
                extents[0] = std::min(count, std::max<std::uint64_t>(kChunkBytes / elementBytes, 1));
                checked(H5Pset_chunk(properties, rank, extents.data()));
                checked(H5Pset_shuffle(properties));
                checked(H5Pset_deflate(properties, compression_));
            }
            Hdf5Dataset const dataset = createDataset(parent, path, type.scalar, space, properties);
            if (count != 0)
                checked(H5Dwrite(dataset, type.scalar, H5S_ALL, H5S_ALL, H5P_DEFAULT, values));
        }

        hid_t file_;
        unsigned int compression_;
        Hdf5Properties linkProperties_;
        bool isTemporary_ = false;
        std::map<void const*, std::string> paths_; // of the objects and arrays that have been written
    };

    Hdf5FileHandle createFile(char const* file)
    {
        // The oldest version of the format with checksums of the structure.
        Hdf5Properties const access(H5Pcreate(H5P_FILE_ACCESS));
        useDescriptors(access);
        checked(H5Pset_libver_bounds(access, H5F_LIBVER_V18, H5F_LIBVER_V18));
        checked(H5Pset_fclose_degree(access, H5F_CLOSE_STRONG));
        checked(H5Pset_file_locking(access, false, true));
        Hdf5Properties const creation(H5Pcreate(H5P_FILE_CREATE));
        checked(H5Pset_link_creation_order(creation, H5P_CRT_ORDER_TRACKED | H5P_CRT_ORDER_INDEXED));
        checked(H5Pset_obj_track_times(creation, false));
        return Hdf5FileHandle(H5Fcreate(file, H5F_ACC_TRUNC, creation, access));
    }

    void writeFile(std::vector<Hdf5Object> const& objects, char const* file, unsigned int compression)
    {
        Hdf5FileHandle handle = createFile(file);
        Hdf5Space const space(H5Screate(H5S_SCALAR));
        {
            Hdf5Attribute const layout(
                H5Acreate2(handle, kLayoutAttribute, H5T_STD_I32LE, space, H5P_DEFAULT, H5P_DEFAULT));
            checked(H5Awrite(layout, H5T_NATIVE_INT, &kLayoutVersion));
        }
        Writer writer(handle, compression);
        for (auto const& [name, object, remark] : objects) {
            Hdf5Group const group = writer.writeGroup(handle, "/" + name, *object, nullptr, 1);
            if (!remark.empty())
                addText(group, "remark", remark);
        }
        handle.close();
    }

}

void modelingWriteHdf5(std::vector<Hdf5Object> const& objects, char const* file, unsigned int compression)
{
    silenceHdf5();
    writeFile(objects, file, compression);
}

}
