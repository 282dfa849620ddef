#include "FileSupport.h"
#include "Hdf5File.h"

#include <hdf5.h>

#include <csignal>

#include <sys/resource.h>

namespace ModelingProgram {

namespace {

    using Objects = std::vector<Hdf5Object>;

    /// Properties of all types and keys of all kinds.
    Orvan::MutablePtr<Object> randomObject(Random& random)
    {
        auto object = makeMesh(randomPositions(4, random), {0, 1, 2, 0, 2, 3}, {0, 3, 6});
        addAllTypes(sPointComp, random, *object);
        for (char const* const component : {sPointComp, sFaceComp, sFaceVertexComp})
            addRandomProperties(component, random, *object);
        auto nested = Tessara::createObject();
        char const zero[] = {'a', '\0', '\0'};
        for (std::string_view const key : {"", ".", "..", "/", "a/b", "50%", "%41", "\x01\x7f\n", "\xff\xfe", "ü", " "})
            nested->setProperty(Orvan::String(key), Orvan::String(std::string_view(zero, random.below(4))));
        nested->setProperty(Orvan::String(std::string_view(zero, 3)), Tessara::PropertyValue());
        forEachElementTypeName([&]<class T>(ElementType<T> type) {
            nested->setProperty(type.name, Orvan::Ptr<Orvan::Array<T>>());
            nested->setProperty((std::string("no ") + type.name).c_str(), Orvan::makePtr<Orvan::Array<T>>());
        });
        nested->setProperty("null", Orvan::Ptr<Object>());
        nested->setProperty("empty", Orvan::makePtr<Object>());
        nested->setProperty("mode", static_cast<Common::DataInterpolationMode>(random.below(5)));
        nested->setProperty(std::string(100000, 'k').c_str(), true);
        nested->setProperty("text", Orvan::String(std::string(70000, 'x')));
        object->setProperty("nested", Orvan::Ptr<Object>(std::move(nested)));
        return object;
    }

    Orvan::Ptr<Object> roundTrip(Orvan::Ptr<Object> const& object, unsigned int compression = 0)
    {
        TemporaryFolder const folder;
        writeHdf5Objects({{"object", object}}, folder / "a.h5", {.compression = compression});
        return readHdf5Objects(folder / "a.h5", Hdf5Selection::Only).front().object;
    }

    TEST(Hdf5, KeepsRandomObjectsToTheBit)
    {
        for (unsigned int seed = 0; seed != 20; ++seed) {
            SCOPED_TRACE(seed);
            Random random(seed);
            Orvan::Ptr<Object> const object = randomObject(random);
            EXPECT_TRUE(sameContents(*roundTrip(object, seed % 3), *object));
        }
    }

    TEST(Hdf5, CompressesArraysOfAllTypes)
    {
        for (unsigned int const count : {200u, 20'000u}) { // less than a chunk of some types, and several chunks
            Random random(1);
            auto points = makePointCloud(randomPositions(count, random));
            addAllTypes(sPointComp, random, *points);
            Orvan::Ptr<Object> const object = std::move(points);
            EXPECT_TRUE(sameContents(*roundTrip(object, 1), *object));
        }
    }

    TEST(Hdf5, KeepsWhatIsShared)
    {
        auto const array = Orvan::makePtr<Orvan::Array<double>>(std::uint64_t{10000}, 0.5);
        auto inner = Tessara::createObject();
        inner->setProperty("values", array);
        Orvan::Ptr<Object> const shared = std::move(inner);
        auto object = Tessara::createObject();
        for (char const* const key : {"a", "b"})
            object->setProperty(key, shared);
        object->setProperty("c", array);
        TemporaryFolder const folder;
        writeHdf5Objects({{"object", std::move(object)}}, folder / "a.h5");
        EXPECT_LT(std::filesystem::file_size(folder / "a.h5"), 90000);
        Orvan::Ptr<Object> const read = readHdf5Objects(folder / "a.h5", Hdf5Selection::Only).front().object;
        auto const at = [](Object const& from, char const* key) { return from.getProperty(key); };
        auto const first = *at(*read, "a").get<Orvan::Ptr<Object>>();
        EXPECT_TRUE(first == *at(*read, "b").get<Orvan::Ptr<Object>>());
        using Doubles = Orvan::Ptr<Orvan::Array<double>>;
        EXPECT_TRUE(*at(*first, "values").get<Doubles>() == *at(*read, "c").get<Doubles>());
    }

    TEST(Hdf5, RefusesWhatFilesCannotHold)
    {
        TemporaryFolder const folder;
        auto const refusal = [&](Orvan::MutablePtr<Object> object) -> std::string {
            try {
                writeHdf5Objects({{"object", std::move(object)}}, folder / "a.h5");
            } catch (FileError const& error) {
                EXPECT_EQ(folder.entryCount(), 0);
                return error.what();
            }
            return {};
        };
        auto unknown = Tessara::createObject();
        unknown->setProperty("a/b", 1L);
        EXPECT_THAT(
            refusal(std::move(unknown)), testing::HasSubstr("/object/a%2Fb: HDF5 files hold no values of the type"));
        auto outer = Tessara::createObject();
        for (int level = 0; level != kHdf5MostLevels; ++level) {
            Orvan::Ptr<Object> inner = std::move(outer);
            (outer = Tessara::createObject())->setProperty("in", inner);
        }
        EXPECT_THAT(refusal(std::move(outer)), testing::HasSubstr("levels deep"));
    }

    TEST(Hdf5, FailsOnAFullDiskWithoutATrace)
    {
        TemporaryFolder const folder;
        rlimit limit{};
        ASSERT_EQ(::getrlimit(RLIMIT_FSIZE, &limit), 0);
        auto* const handler = std::signal(SIGXFSZ, SIG_IGN);
        rlimit const small{100000, limit.rlim_max};
        ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &small), 0);
        auto const points = makePointCloud(Orvan::Array<float3>(100000));
        EXPECT_THROW(writeGeometryFile(*points, folder / "a.h5"), FileError);
        EXPECT_THROW(writeGeometryFile(*points, folder / "a.h5"), FileError); // the library still works
        ::setrlimit(RLIMIT_FSIZE, &limit);
        std::signal(SIGXFSZ, handler);
        EXPECT_EQ(folder.entryCount(), 0);
    }

    /// What is said of a file, after its name.
    std::string refusalOfFile(std::filesystem::path const& file, ReadOptions const& options = {})
    {
        try {
            readGeometryFile(file, options);
        } catch (FileError const& error) {
            std::string const text = error.what(), name = fileOf(file).string();
            EXPECT_TRUE(text.starts_with(name)) << text;
            return text.substr(std::min(text.size(), name.size()));
        }
        return {};
    }

    TEST(Hdf5, HoldsSeveralObjects)
    {
        TemporaryFolder const folder;
        auto const mesh = makeMesh({{0, 0, 0}, {1, 0, 0}, {1, 1, 0}}, {0, 1, 2}, {0, 3});
        auto const cloud = makePointCloud({{1, 2, 3}});
        writeGeometryFile(*mesh, folder / "a.h5#left");
        writeGeometryFile(*cloud, folder / "a.h5#right arm.obj");
        EXPECT_TRUE(sameContents(*readGeometryFile(folder / "a.h5#left").object, *mesh));
        writeGeometryFile(*cloud, folder / "a.h5#left", {.remark = "moved"});
        auto const objects = readHdf5Objects(folder / "a.h5", Hdf5Selection::All);
        ASSERT_EQ(objects.size(), 2);
        EXPECT_EQ(objects[0].remark, "moved");
        EXPECT_TRUE(sameContents(*objects[0].object, *cloud));
        EXPECT_TRUE(sameContents(*objects[1].object, *cloud));
        EXPECT_THAT(refusalOfFile(folder / "a.h5"), testing::HasSubstr("2 objects: left, right arm.obj"));
        EXPECT_THAT(refusalOfFile(folder / "a.h5#up"), testing::HasSubstr("no object \"up\""));
        EXPECT_THROW(writeGeometryFile(*mesh, folder / "a.h5#up", {.existing = Existing::Keep}), FileError);
        EXPECT_THROW(writeGeometryFile(*mesh, folder / "b.h5#50%"), FileError);
        writeGeometryFile(*mesh, folder / "a.h5");
        EXPECT_TRUE(sameContents(*readGeometryFile(folder / "a.h5").object, *mesh));
    }

    TEST(Hdf5, TreatsGeometryAsOtherFormatsDo)
    {
        TemporaryFolder const folder;
        auto const store = [&](Orvan::Ptr<Object> const& object) {
            writeHdf5Objects({{"object", object}}, folder / "a.h5");
        };
        // The first point belongs to no strand.
        store(makeStrands({{9, 9, 9}, {kNan, 0, 0}, {1, 0, 0}, {2, 0, 0}, {4, 0, 0}}, {1, 3, 5}));
        EXPECT_THAT(refusalOfFile(folder / "a.h5"),
            testing::StartsWith(", /object/sPointPosition/sData: a coordinate of element 1 "));
        GeometryFile const strands = readGeometryFile(folder / "a.h5", {.isLenient = true, .origin = double3{1, 0, 0}});
        EXPECT_TRUE(isValid(*strands.object));
        EXPECT_EQ(
            *dataOf<float3>(*strands.object, sPointPosition), (Orvan::Array<float3>{{8, 9, 9}, {1, 0, 0}, {3, 0, 0}}));
        EXPECT_EQ(*dataOf<unsigned int>(*strands.object, sStrandOffset), (Orvan::Array<unsigned int>{1, 3}));
        store(makeMesh({{0, 0, 0}, {1, 0, 0}, {1, 1, 0}}, {0, 1, 0, 1, 2}, {0, 2, 5}));
        EXPECT_THAT(refusalOfFile(folder / "a.h5"), testing::HasSubstr("face 0 has fewer than three corners"));
        EXPECT_EQ(getElementCount(*readGeometryFile(folder / "a.h5", {.isLenient = true}).object, sFaceComp), 1u);
    }

    TEST(Hdf5, AsksBeforeItInflates)
    {
        TemporaryFolder const folder;
        constexpr std::uint64_t kBytes = 50'000'000;
        auto object = Tessara::createObject();
        object->setProperty("zeros", Orvan::makePtr<Orvan::Array<unsigned char>>(kBytes));
        writeHdf5Objects({{"object", std::move(object)}}, folder / "a.h5", {.compression = 9});
        EXPECT_LT(std::filesystem::file_size(folder / "a.h5"), kBytes / 500);
        auto const refuse = [](std::uint64_t bytes) {
            if (bytes >= kBytes)
                throw std::length_error("");
        };
        EXPECT_THROW(readHdf5Objects(folder / "a.h5", Hdf5Selection::Only, "", refuse), std::length_error);
    }

    hid_t makeDataset(
        hid_t file, char const* name, hid_t type, std::vector<hsize_t> const& extents, hid_t properties = H5P_DEFAULT)
    {
        hid_t const space = H5Screate_simple(static_cast<int>(extents.size()), extents.data(), nullptr);
        return H5Dcreate2(file, name, type, space, H5P_DEFAULT, properties, H5P_DEFAULT);
    }

    hid_t chunked(void (*change)(hid_t properties))
    {
        hsize_t const chunk = 10;
        hid_t const properties = H5Pcreate(H5P_DATASET_CREATE);
        H5Pset_chunk(properties, 1, &chunk);
        change(properties);
        return properties;
    }

    /// Changes to a file with an object of two strings, and what is then said.
    struct Fault {
        void (*make)(hid_t file);
        std::string refusal; // how it begins; empty if the file is in order
    };

    constexpr hsize_t kHuge = hsize_t{1} << 40;
    constexpr unsigned long long kOffsets[] = {0, 3, 2};

    Fault const kFaults[] = {
        {[](hid_t file) { H5Lcreate_soft("/object", file, "/object/a", 0, 0); },
            "/object/a: it is a soft or an external"},
        {[](hid_t file) { H5Lcreate_external("b.h5", "/", file, "/object/a", 0, 0); }, "/object/a: it is a soft or"},
        {[](hid_t file) { H5Lcreate_hard(file, "/object", file, "/object/a", 0, 0); },
            "/object/a: this object contains"},
        {[](hid_t file) { makeDataset(file, "/object/a", H5T_IEEE_F32LE, {kHuge}); },
            "/object/a: the file does not hold"},
        {[](hid_t file) { makeDataset(file, "/object/a", H5T_IEEE_F32LE, {kHuge}, chunked([](hid_t) {})); },
            "/object/a: the file does not hold all of its chunks"},
        {[](hid_t file) {
             makeDataset(file, "/object/a", H5T_IEEE_F32LE, {20}, chunked([](hid_t p) {
                 H5Pset_fletcher32(p);
                 H5Pset_alloc_time(p, H5D_ALLOC_TIME_EARLY);
             }));
         },
            "/object/a: it is stored with the filter 3 (fletcher32)"},
        {[](hid_t file) {
             hid_t const properties = H5Pcreate(H5P_DATASET_CREATE);
             H5Pset_external(properties, "/etc/passwd", 0, 4);
             makeDataset(file, "/object/a", H5T_STD_U8LE, {4}, properties);
         },
            "/object/a: its values are in other files"},
        {[](hid_t file) { makeDataset(file, "/object/a", H5T_IEEE_F32BE, {1}); }, "/object/a: it holds floating-point"},
        {[](hid_t file) {
             makeDataset(file, "/object/a", H5T_IEEE_F32LE, {4, 5});
         },
            "/object/a: it holds floating-point"},
        {[](hid_t file) { H5Tcommit2(file, "/object/a", H5Tcopy(H5T_STD_I8LE), 0, 0, 0); }, "/object/a: it is neither"},
        {[](hid_t file) { H5Gcreate2(file, "/object/5%", 0, 0, 0); }, "/object/5%: in its name"},
        {[](hid_t file) {
             H5Gcreate2(file, "/object/A", 0, 0, 0);
             H5Gcreate2(file, "/object/%41", 0, 0, 0);
         },
            "/object/%41: there is another value of that name"},
        {[](hid_t file) { makeDataset(file, "/a", H5T_IEEE_F32LE, {1}); }, "/: there are 2 objects: object, a"},
        {[](hid_t file) { H5Lmove(file, "/object/strings", file, "/a", 0, 0), H5Ldelete(file, "/object", 0); },
            "/a: it is not an object"},
        {[](hid_t file) { H5Adelete(file, "modeling_layout"); }, "/: there is no attribute \"modeling_layout\""},
        {[](hid_t file) { H5Adelete_by_name(file, "/object/strings", "kind", 0); }, ""}, // an object of two arrays
        {[](hid_t file) { H5Arename_by_name(file, "/object", "remark", "kind", 0); },
            "/object: its attribute \"kind\" is \"note\""},
        {[](hid_t file) { H5Ldelete(file, "/object/strings/bytes", 0); }, "/object/strings/bytes: it is missing"},
        {[](hid_t file) {
             hid_t const offsets = H5Dopen2(file, "/object/strings/offsets", 0);
             H5Dwrite(offsets, H5T_NATIVE_ULLONG, 0, 0, 0, kOffsets);
         },
            "/object/strings/offsets: element 2 is less than the one before it"},
        {[](hid_t file) {
             hid_t const flags = H5Dopen2(file, "/object/flags", 0), type = H5Dget_type(flags);
             H5Dwrite(flags, type, 0, 0, 0, "\1\2");
         },
            "/object/flags: element 1 is 2, neither true nor false"},
    };

    TEST(Hdf5, NamesTheFault)
    {
        auto object = Tessara::createObject();
        object->setProperty(
            "strings", Orvan::makePtr<Orvan::Array<Orvan::String>>(Orvan::Array<Orvan::String>{"a", "b"}));
        object->setProperty("flags", Orvan::makePtr<Orvan::Array<bool>>(Orvan::Array<bool>{true, true}));
        Orvan::Ptr<Object> const whole = std::move(object);
        TemporaryFolder const folder;
        std::filesystem::path const file = folder / "a.h5";
        testing::internal::CaptureStderr();
        for (Fault const& fault : kFaults) {
            writeHdf5Objects({{"object", whole, "note"}}, file);
            hid_t const access = H5Pcreate(H5P_FILE_ACCESS);
            H5Pset_fclose_degree(access, H5F_CLOSE_STRONG);
            hid_t const handle = H5Fopen(file.c_str(), H5F_ACC_RDWR, access);
            fault.make(handle);
            ASSERT_GE(H5Fclose(handle), 0);
            std::string const refusal = refusalOfFile(file);
            EXPECT_TRUE(refusal.starts_with(", " + fault.refusal) || refusal == fault.refusal) << refusal;
        }
        EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
    }

    /// The file is read or refused. Anything else is a bug in the reader.
    bool isRead(std::filesystem::path const& file)
    {
        try {
            readHdf5Objects(file, Hdf5Selection::All);
            return true;
        } catch (FileError const& error) {
            EXPECT_NE(std::string(error.what()).find(file.string()), std::string::npos);
            return false;
        }
    }

    TEST(Hdf5, ReadsOrRefusesBrokenFiles)
    {
        TemporaryFolder const folder;
        std::filesystem::path const file = folder / "a.h5";
        for (unsigned int const compression : {0u, 1u}) {
            Random random(compression);
            auto points = makePointCloud(randomPositions(compression == 0 ? 3 : 400, random));
            addAllTypes(sPointComp, random, *points);
            writeHdf5Objects({{"object", std::move(points)}}, file, {.compression = compression});
            std::string const content = contentOf(file);
            for (std::size_t i = 0; i != 15; ++i) {
                store(file, std::string_view(content).substr(0, i * content.size() / 15));
                EXPECT_FALSE(isRead(file));
            }
            int readCount = 0;
            for (int i = 0; i != 150; ++i) {
                std::string broken = content;
                for (unsigned int changes = 1 + random.below(3); changes != 0; --changes)
                    broken[random.below(broken.size())] = static_cast<char>(random.below(256));
                store(file, broken);
                readCount += isRead(file);
            }
            EXPECT_LT(readCount, 150);
        }
    }

}

}
