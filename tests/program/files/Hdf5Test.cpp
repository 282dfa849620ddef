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

    TEST(Hdf5, keepsRandomObjectsToTheBit)
    {
        for (unsigned int seed = 0; seed != 40; ++seed) {
            SCOPED_TRACE(seed);
            Random random(seed);
            Orvan::Ptr<Object> const object = randomObject(random);
            EXPECT_TRUE(sameContents(*roundTrip(object, seed % 3), *object));
        }
    }

    TEST(Hdf5, compressesArraysOfAllTypes)
    {
        for (std::size_t const count : {200, 100000}) { // less than a chunk of some types, and several chunks
            Random random(1);
            auto points = makePointCloud(randomPositions(count, random));
            addAllTypes(sPointComp, random, *points);
            Orvan::Ptr<Object> const object = std::move(points);
            EXPECT_TRUE(sameContents(*roundTrip(object, 1), *object));
        }
    }

    void mutate(std::string const& content, Random& random, TemporaryFolder const& folder)
    {
        std::string broken = content;
        for (unsigned int changes = 1 + random.below(3); changes != 0; --changes)
            broken[random.below(broken.size())] = static_cast<char>(random.below(256));
        store(folder / "a.h5", broken);
        try {
            readHdf5Objects(folder / "a.h5", Hdf5Selection::All);
        } catch (FileError const& error) {
            EXPECT_NE(std::string(error.what()).find((folder / "a.h5").string()), std::string::npos);
            if (getenv("SHOW")) puts(error.what());
        }
    }

    TEST(Hdf5, readsOrRefusesBrokenFiles)
    {
        TemporaryFolder const folder;
        Random random(1);
        auto const mesh = makeMesh({{0, 0, 0}, {1, 0, 0}, {1, 1, 0}}, {0, 1, 2}, {0, 3});
        addAllTypes(sPointComp, random, *mesh);
        writeHdf5Objects({{"object", Orvan::makePtr<Object>(*mesh)}}, folder / "a.h5");
        std::string const content = contentOf(folder / "a.h5");
        for (int i = 0; i != 500; ++i)
            mutate(content, random, folder);
    }

}

}
