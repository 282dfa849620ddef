#include "Bags.h"

#include <TessaraGeometry/Names.h>

#include <cstring>
#include <functional>
#include <type_traits>

namespace Fuzzing {

using Tessara::PropertyValue;

namespace {

    constexpr char const* kNames[] = {
        "a", "b", "uv", "uv1", "color", "a name that needs an allocation", "", "\xC3\xA4"};
    constexpr char const* kHostNames[] = {sPointComp, sFaceComp, sFaceVertexComp, sStrandComp, sPointPosition,
        sFaceVertex, sFaceOffset, sStrandOffset, Object::kExcludedKeys};
    constexpr char const* kInner[] = {sData, sTarget, sDefault, sInterp, sDependsOn, sIndices, "sElementCount"};

    unsigned int below(std::size_t bound, Bytes& bytes)
    {
        return bytes.ConsumeIntegralInRange<unsigned int>(0, static_cast<unsigned int>(bound - 1));
    }

    template <class T> T anyValue(Bytes& bytes)
    {
        T value{};
        if constexpr (std::is_same_v<T, Orvan::String>) {
            value = bytes.ConsumeRandomLengthString(24).c_str();
        } else if constexpr (std::is_same_v<T, Common::GeoLocation>) {
            value = {anyValue<Orvan::String>(bytes), anyName(bytes), below(9, bytes), {}};
        } else if constexpr (std::is_same_v<T, bool>) {
            value = bytes.ConsumeBool();
        } else {
            std::vector<char> const raw = bytes.ConsumeBytes<char>(sizeof(T));
            if (!raw.empty())
                std::memcpy(&value, raw.data(), raw.size());
        }
        return value;
    }

    /// Three values, repeated.
    template <class T> Orvan::Array<T> anyValues(std::size_t count, Bytes& bytes)
    {
        Orvan::Array<T> values(count);
        for (std::size_t i = 0; i != count; ++i)
            values[i] = i < 3 ? anyValue<T>(bytes) : values[i % 3];
        return values;
    }

    /// Calls `visit(ElementType<T>)` with one of the forty element types.
    template <class Visit> void withAnyType(Bytes& bytes, Visit const& visit)
    {
        unsigned int type = below(40, bytes); // counts down
        forEachElementTypeName([&](auto element) {
            if (type-- == 0)
                visit(element);
        });
    }

    PolygonMesh anyFaces(Bytes& bytes)
    {
        PolygonMesh mesh;
        for (unsigned int points = below(12, bytes); points != 0; --points)
            mesh.points.push_back(anyPoint(bytes));
        for (unsigned int faces = below(12, bytes); faces != 0; --faces) {
            for (unsigned int corners = mesh.points.empty() ? 0 : below(7, bytes); corners != 0; --corners)
                mesh.faceVertex.push_back(below(mesh.points.size(), bytes));
            mesh.faceOffset.push_back(static_cast<unsigned int>(mesh.faceVertex.size()));
        }
        return mesh;
    }

    MeshBuilder anyTriangles(Bytes& bytes)
    {
        auto const shape = [&]() -> MeshBuilder {
            switch (below(6, bytes)) {
            case 0:
                return MeshBuilder::tetrahedron();
            case 1:
                return MeshBuilder::sphere(1 + below(3, bytes));
            case 2:
                return MeshBuilder::icosahedron();
            case 3: {
                unsigned int const rings = 3 + below(4, bytes);
                return MeshBuilder::torus(rings, 3 + below(4, bytes));
            }
            case 4:
                return MeshBuilder::bipyramid(3 + below(12, bytes));
            default:
                return MeshBuilder::wheel(3 + below(12, bytes), {anyNumber(bytes), anyNumber(bytes), 1});
            }
        };
        MeshBuilder mesh = shape();
        if (bytes.ConsumeBool())
            mesh = std::move(mesh).joinedWith(shape(), anyPoint(bytes));
        if (bytes.ConsumeBool())
            mesh = std::move(mesh).withNeedles(1 + below(8, bytes), anyNumber(bytes));
        if (bytes.ConsumeBool())
            mesh = std::move(mesh).shuffled(below(256, bytes));
        for (unsigned int holes = below(3, bytes); holes != 0; --holes)
            mesh = std::move(mesh).withoutFace(below(mesh.faces.size(), bytes));
        return mesh;
    }

    PolygonMesh anyPolygons(Bytes& bytes)
    {
        PolygonMesh mesh;
        switch (below(4, bytes)) {
        case 0:
            mesh = anyFaces(bytes);
            break;
        case 1:
            mesh = PolygonMesh::quads(1 + below(4, bytes));
            break;
        case 2: {
            unsigned int const count = 1 + below(3, bytes), corners = 3 + below(30, bytes);
            mesh = PolygonMesh::stars(count, 3, corners, below(256, bytes));
            break;
        }
        default:
            mesh = anyTriangles(bytes).polygons();
        }
        for (unsigned int moved = mesh.points.empty() ? 0 : below(4, bytes); moved != 0; --moved)
            mesh.points[below(mesh.points.size(), bytes)] = anyPoint(bytes);
        for (unsigned int joined = mesh.faceVertex.empty() ? 0 : below(4, bytes); joined != 0; --joined)
            mesh.faceVertex[below(mesh.faceVertex.size(), bytes)] = below(mesh.points.size(), bytes);
        return mesh;
    }

    Orvan::MutablePtr<Object> anyStrands(Bytes& bytes)
    {
        Orvan::Array<float3> points = anyPoints(20, bytes);
        auto const count = static_cast<unsigned int>(points.size);
        Orvan::Array<unsigned int> offsets = numbersBelow(count, 6, bytes);
        std::sort(offsets.begin(), offsets.end());
        offsets.append(count);
        return makeStrands(std::move(points), std::move(offsets));
    }

    /// Mostly the number of elements.
    std::size_t anyLength(std::size_t count, Bytes& bytes)
    {
        unsigned int const choice = below(8, bytes);
        return choice == 0 ? count + 1 + below(4, bytes) : choice == 1 ? below(count + 1, bytes) : count;
    }

    void addAnyProperty(std::vector<Orvan::String>& targets, Bytes& bytes, Object& object)
    {
        Orvan::String const name = anyName(bytes), target = targets[below(targets.size(), bytes)];
        std::size_t const length = anyLength(object.hasProperty(target) ? getElementCount(object, target) : 0, bytes);
        switch (below(10, bytes)) {
        case 0: {
            auto const indices = numbersBelow(static_cast<unsigned int>(length + 1), length, bytes);
            addRangeProperty(name, target, Orvan::Array<unsigned int>(indices), object);
            targets.push_back(name);
            break;
        }
        case 1:
            object.setProperty(name, anyValue<float>(bytes));
            break;
        case 2:
            object.setProperty(name, object.getProperty(anyName(bytes)));
            break;
        default:
            withAnyType(bytes, [&]<class T>(ElementType<T>) {
                addDataProperty<T>(name, target, anyValues<T>(length, bytes), object, anyValue<T>(bytes));
            });
            if (below(6, bytes) == 0)
                replaceIn(name, bytes.ConsumeBool() ? sData : sDefault, {}, object);
        }
    }

    void addAnyProperties(Bytes& bytes, Object& object)
    {
        std::vector<Orvan::String> targets;
        for (char const* const component : {sPointComp, sFaceVertexComp, sFaceComp, sStrandComp})
            if (object.hasProperty(component))
                targets.emplace_back(component);
        targets.push_back(anyName(bytes));
        for (unsigned int count = below(7, bytes); count != 0; --count)
            addAnyProperty(targets, bytes, object);
    }

    Orvan::String anyKey(Bytes& bytes)
    {
        unsigned int const choice = below(std::size(kHostNames) + std::size(kInner) + 1, bytes);
        return choice < std::size(kHostNames)                    ? kHostNames[choice]
            : choice < std::size(kHostNames) + std::size(kInner) ? kInner[choice - std::size(kHostNames)]
                                                                 : anyName(bytes);
    }

    PropertyValue anyProperty(int levels, Bytes& bytes)
    {
        PropertyValue value;
        switch (below(8, bytes)) {
        case 0:
            break;
        case 1:
            value = anyKey(bytes);
            break;
        case 2:
            value = bytes.ConsumeIntegral<unsigned int>();
            break;
        case 3:
            value = Orvan::Ptr<Object>();
            break;
        case 4: {
            auto nested = Tessara::createObject();
            for (unsigned int keys = levels == 0 ? 0 : below(4, bytes); keys != 0; --keys)
                nested->setProperty(anyKey(bytes), anyProperty(levels - 1, bytes));
            value = Orvan::Ptr<Object>(std::move(nested));
            break;
        }
        case 5:
            withAnyType(bytes, [&]<class T>(ElementType<T>) { value = anyValue<T>(bytes); });
            break;
        case 6:
            withAnyType(bytes, [&]<class T>(ElementType<T>) { value = Orvan::Ptr<Orvan::Array<T>>(); });
            break;
        default:
            withAnyType(bytes, [&]<class T>(ElementType<T>) {
                value = Orvan::makePtr<Orvan::Array<T>>(anyValues<T>(below(12, bytes), bytes));
            });
        }
        return value;
    }

}

float anyNumber(Bytes& bytes)
{
    constexpr float kInfinity = std::numeric_limits<float>::infinity();
    constexpr float kOdd[] = {
        kNan, kInfinity, -kInfinity, -0.0f, 3e38f, -3e38f, 1e-45f, 1e-20f, 1e20f, 1e9f, 16777217.0f};
    unsigned int const choice = below(64, bytes);
    return choice < std::size(kOdd) ? kOdd[choice]
        : choice < 16               ? anyValue<float>(bytes)
                                    : static_cast<float>(bytes.ConsumeIntegral<signed char>()) / 32;
}

float3 anyPoint(Bytes& bytes)
{
    float const x = anyNumber(bytes), y = anyNumber(bytes);
    return {x, y, anyNumber(bytes)};
}

Orvan::Array<float3> anyPoints(std::size_t most, Bytes& bytes)
{
    Orvan::Array<float3> points(bytes.ConsumeIntegralInRange<std::size_t>(0, most));
    for (float3& point : points)
        point = anyPoint(bytes);
    return points;
}

Orvan::String anyName(Bytes& bytes)
{
    return kNames[below(std::size(kNames), bytes)];
}

Orvan::MutablePtr<Object> validBag(Kind kind, Bytes& bytes)
{
    auto object = kind == Kind::Mesh ? anyPolygons(bytes).build()
        : kind == Kind::PointCloud   ? makePointCloud(anyPoints(20, bytes))
                                     : anyStrands(bytes);
    addAnyProperties(bytes, *object);
    return object;
}

Orvan::MutablePtr<Object> anyBag(Bytes& bytes)
{
    auto object = validBag(bytes.ConsumeEnum<Kind>(), bytes);
    for (unsigned int changes = below(6, bytes); changes != 0; --changes) {
        Orvan::String const key = anyKey(bytes);
        auto const value = object->getProperty(key);
        auto const* const held = value.get<Orvan::Ptr<Object>>();
        switch (below(4, bytes)) {
        case 0:
            object->eraseProperty(key);
            break;
        case 1:
            setElementCount(key, bytes.ConsumeIntegral<unsigned int>(), *object);
            break;
        case 2:
            object->setProperty(key, anyProperty(3, bytes));
            break;
        default:
            if (held && *held)
                replaceIn(key, kInner[below(std::size(kInner), bytes)], anyProperty(2, bytes), *object);
        }
    }
    return object;
}

}
