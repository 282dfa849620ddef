#include "Writers.h"

#include "GltfDocument.h"

#include <bit>
#include <functional>
#include <limits>
#include <set>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using namespace Tessara::Math;

namespace {

    static_assert(std::endian::native == std::endian::little, "numbers are written with the byte order of memory");

    using OrderedJson = nlohmann::ordered_json;
    using Indices = Orvan::Array<unsigned int>;

    enum : int { kArrayBuffer = 34962, kElementArrayBuffer = 34963 }; // what a buffer view is for
    enum : int { kPoints = 0, kLines = 1, kTriangles = 4 };

    /// A number in an attribute as the file stores it.
    enum class Storage { Leave, Same, Float, Byte };

    /// Doubles and 32-bit integers become floats, since attributes have no such types; bools become bytes. Other types
    /// cannot be held.
    template <class T> constexpr Storage storageOf()
    {
        using Scalar = typename ElementLayout<T>::Scalar;
        constexpr unsigned int n = ElementLayout<T>::components;
        constexpr bool isMatrix = requires(T matrix)
        {
            matrix.rows;
        };
        if constexpr (n == 0 || (isMatrix && n != 9 && n != 16))
            return Storage::Leave;
        else if constexpr (std::is_same_v<Scalar, bool>)
            return Storage::Byte;
        else if constexpr (std::is_same_v<Scalar, double> || (std::is_integral_v<Scalar> && sizeof(Scalar) == 4))
            return Storage::Float;
        else
            return sizeof(Scalar) > 4 ? Storage::Leave : Storage::Same;
    }

    template <class Scalar> constexpr GltfScalar scalarOf()
    {
        if constexpr (std::is_floating_point_v<Scalar>)
            return GltfScalar::Float;
        else if constexpr (sizeof(Scalar) == 1)
            return std::is_signed_v<Scalar> && !std::is_same_v<Scalar, bool> ? GltfScalar::Byte
                                                                             : GltfScalar::UnsignedByte;
        else
            return std::is_signed_v<Scalar> ? GltfScalar::Short : GltfScalar::UnsignedShort;
    }

    /// An attribute of the vertices. The values are those of an attribute of points or corners.
    struct VertexAttribute {
        std::string semantic;
        GltfScalar scalar;
        unsigned int components;
        bool isMatrix;
        bool isNormalized;
        std::size_t stride; // in the file
        Attribute const* source;
        bool isOfCorners;
        // Writes the value of an element without padding.
        std::function<void(std::uint64_t, OutputFile&)> write;
    };

    /// Vertices of the file. The first ones are the points in their order; if attributes of corners differ at a point,
    /// further vertices at the same position follow.
    struct GlbVertices {
        Indices ofCorners; // one entry per corner; null if the corners have the vertices of their points
        Indices points; // of the vertices beyond the first of each point
        Indices corners; // one entry per vertex: a corner that has its values, or kInvalidIndex; empty without splits
    };

    class GltfWriter {
    public:
        GltfWriter(WritableGeometry& geometry, std::filesystem::path const& file, std::uint64_t mostBytes)
            : geometry_(geometry)
            , file_(file)
            , mostBytes_(mostBytes)
        {
        }

        void write()
        {
            checkTriangles();
            chooseAttributes();
            splitPoints();
            declare();
            std::string json = root_.dump(-1, ' ', false, OrderedJson::error_handler_t::replace);
            json.resize((json.size() + 3) / 4 * 4, ' ');
            std::uint64_t const total = 12 + 8 + json.size() + (binaryBytes_ == 0 ? 0 : 8 + binaryBytes_);
            if (total > mostBytes_)
                refuse("it would have " + std::to_string(total)
                    + " bytes, but GLB files cannot be larger than 4 GiB; PLY files can");

            OutputFile out(file_, geometry_.existing);
            out << "glTF";
            out.writeBinary<std::uint32_t>(2);
            out.writeBinary(static_cast<std::uint32_t>(total));
            out.writeBinary(static_cast<std::uint32_t>(json.size()));
            out << "JSON" << json;
            if (binaryBytes_ != 0) {
                out.writeBinary(static_cast<std::uint32_t>(binaryBytes_));
                out << std::string_view("BIN\0", 4);
                for (auto const& block : blocks_)
                    block(out);
            }
            out.commit();
        }

    private:
        [[noreturn]] void refuse(std::string const& why) const
        {
            throw FileError(file_.string() + " cannot be written: " + why);
        }

        void checkTriangles() const
        {
            if (geometry_.kind != WritableGeometry::Kind::Mesh)
                return;
            Indices const& offset = *geometry_.offsets;
            for (std::uint64_t face = 0; face + 1 < offset.size; ++face) {
                if (offset[face + 1] - offset[face] != 3)
                    refuse("GLB files hold triangles only, but face " + std::to_string(face) + " has "
                        + std::to_string(offset[face + 1] - offset[face])
                        + " corners; OBJ, PLY and VTP files can hold it");
            }
        }

        // Attributes

        void chooseAttributes()
        {
            // Values of corners take precedence over those of points, as in OBJ files.
            for (char const* const component : {sFaceVertexComp, sPointComp})
                for (Attribute const& attribute : geometry_.attributes)
                    if (attribute.component == component)
                        choose(attribute);
            for (Attribute const& attribute : geometry_.attributes)
                if (attribute.component != sFaceVertexComp && attribute.component != sPointComp)
                    leaveOut(attribute, "GLB files can hold only values of points and corners", geometry_.leftOut);
            // Sets of texture coordinates and colors are numbered without gaps.
            for (std::string const prefix : {"TEXCOORD_", "COLOR_"})
                closeGaps(prefix);
        }

        void choose(Attribute const& attribute)
        {
            if (geometry_.pointCount() == 0) {
                leaveOut(attribute, "there are no points", geometry_.leftOut);
                return;
            }
            visitArray(attribute.values, [&]<class T>(Orvan::Array<T> const& values, ElementType<T>) {
                if constexpr (storageOf<T>() == Storage::Leave)
                    leaveOut(attribute, "GLB files have no such type", geometry_.leftOut);
                else
                    chooseValues<T>(attribute, values);
            });
        }

        template <class T> void chooseValues(Attribute const& attribute, Orvan::Array<T> const& values)
        {
            using Scalar = typename ElementLayout<T>::Scalar;
            constexpr unsigned int n = ElementLayout<T>::components;
            constexpr bool isFloat = storageOf<T>() == Storage::Float;
            auto const* const scalars = reinterpret_cast<Scalar const*>(values.data);
            std::uint64_t const scalarCount = values.size * n;
            if constexpr (std::is_floating_point_v<Scalar>) {
                bool const areFinite = std::all_of(scalars, scalars + scalarCount,
                    [](Scalar value) { return std::isfinite(static_cast<float>(value)); });
                if (!areFinite) {
                    leaveOut(attribute, "GLB files cannot hold values that are not finite", geometry_.leftOut);
                    return;
                }
            } else if constexpr (isFloat) {
                bool const areExact = std::all_of(scalars, scalars + scalarCount, [](Scalar value) {
                    return static_cast<double>(static_cast<float>(value)) == static_cast<double>(value);
                });
                if (!areExact) {
                    leaveOut(attribute, "GLB files have only floats for such large integers", geometry_.leftOut);
                    return;
                }
            }
            if (isFloat)
                note(attribute, "is written as floats: GLB files have no " + std::string(elementTypeName<Scalar>()));
            if (storageOf<T>() == Storage::Byte)
                note(attribute, "is written as bytes, 0 or 1: GLB files have no bool");

            VertexAttribute chosen;
            chosen.semantic = semanticOf<T>(attribute, values);
            chosen.isNormalized = !std::is_floating_point_v<Scalar> && !isFloat && chosen.semantic[0] != '_';
            chosen.scalar = isFloat ? GltfScalar::Float : scalarOf<Scalar>();
            chosen.components = n;
            chosen.isMatrix = requires(T matrix)
            {
                matrix.rows;
            };
            std::size_t const valueBytes = n * (isFloat ? sizeof(float) : sizeof(Scalar));
            chosen.stride = (valueBytes + 3) / 4 * 4;
            chosen.source = &attribute;
            chosen.isOfCorners = attribute.component == sFaceVertexComp;
            chosen.write = writerOf<T>(scalars);
            attributes_.push_back(std::move(chosen));
        }

        template <class T> static std::function<void(std::uint64_t, OutputFile&)> writerOf(
            typename ElementLayout<T>::Scalar const* scalars)
        {
            constexpr unsigned int n = ElementLayout<T>::components;
            constexpr unsigned int side = n == 9 ? 3 : 4; // of matrices, which the file has column by column
            constexpr bool isMatrix = requires(T matrix)
            {
                matrix.rows;
            };
            using Stored =
                std::conditional_t<storageOf<T>() == Storage::Float, float, typename ElementLayout<T>::Scalar>;
            return [=](std::uint64_t element, OutputFile& out) {
                Stored stored[n];
                for (unsigned int i = 0; i < n; ++i)
                    stored[i] = static_cast<Stored>(scalars[element * n + (isMatrix ? i % side * side + i / side : i)]);
                out.write(stored, sizeof(stored));
            };
        }

        /// Names that the format defines are only for values as it defines them; all others begin with an underscore.
        template <class T> std::string semanticOf(Attribute const& attribute, Orvan::Array<T> const& values)
        {
            using Scalar = typename ElementLayout<T>::Scalar;
            constexpr unsigned int n = ElementLayout<T>::components;
            std::string const name = validUtf8(attribute.name);
            std::string semantic;
            if constexpr (std::is_floating_point_v<Scalar> && n == 3) {
                if (name == "normal" && std::all_of(values.begin(), values.end(), isUnit<T>))
                    semantic = "NORMAL";
            }
            if constexpr (std::is_floating_point_v<Scalar> && n == 2) {
                if (isNumbered(name, "uv"))
                    semantic = "TEXCOORD_" + numberIn(name, "uv");
            }
            if constexpr ((n == 3 || n == 4)
                && (std::is_floating_point_v<Scalar> || std::is_same_v<Scalar, unsigned char>)) {
                if (isNumbered(name, "color") && areColors(values))
                    semantic = "COLOR_" + numberIn(name, "color");
            }
            if (!semantic.empty() && semantics_.insert(semantic).second)
                return semantic;
            if (name == "normal")
                note(attribute, "is written as \"_normal\": GLB files can hold one unit vector per point or corner");
            if (name == "color")
                note(attribute,
                    "is written as \"_color\": GLB files can hold one color from 0 to 1 per point or corner");
            for (semantic = "_" + name; !semantics_.insert(semantic).second;)
                semantic.insert(0, "_");
            return semantic;
        }

        template <class T> static bool isUnit(T const& v)
        {
            constexpr double kTolerance = 1e-3; // of the squared length; exporters round to bytes
            double const x = v.x, y = v.y, z = v.z;
            return std::abs(x * x + y * y + z * z - 1) <= kTolerance;
        }

        template <class T> static bool areColors(Orvan::Array<T> const& values)
        {
            using Scalar = typename ElementLayout<T>::Scalar;
            auto const* const scalars = reinterpret_cast<Scalar const*>(values.data);
            return std::is_integral_v<
                       Scalar> || std::all_of(scalars, scalars + values.size * ElementLayout<T>::components, [](Scalar value) {
                return value >= 0 && value <= 1;
            });
        }

        /// "uv", "uv1", "uv2", ...
        static bool isNumbered(std::string const& name, std::string_view prefix)
        {
            std::string_view const number = std::string_view(name).substr(std::min(name.size(), prefix.size()));
            return name.starts_with(prefix) && number.size() < 3 && !number.starts_with('0')
                && number.find_first_not_of("0123456789") == std::string_view::npos;
        }

        static std::string numberIn(std::string const& name, std::string_view prefix)
        {
            return name.size() == prefix.size() ? "0" : name.substr(prefix.size());
        }

        /// Numbered attributes after a missing one get names of their own.
        void closeGaps(std::string const& prefix)
        {
            unsigned int next = 0;
            while (semantics_.contains(prefix + std::to_string(next)))
                ++next;
            for (VertexAttribute& attribute : attributes_) {
                if (!attribute.semantic.starts_with(prefix)
                    || static_cast<unsigned int>(std::stoul(attribute.semantic.substr(prefix.size()))) < next)
                    continue;
                attribute.semantic = "_" + validUtf8(attribute.source->name);
                while (!semantics_.insert(attribute.semantic).second)
                    attribute.semantic.insert(0, "_");
                attribute.isNormalized = false;
            }
        }

        void note(Attribute const& attribute, std::string const& what)
        {
            geometry_.leftOut.push_back("\"" + attribute.name + "\" " + what);
        }

        // Vertices

        /// The file has one value per vertex and attribute: corners of a point with different values need vertices of
        /// their own.
        void splitPoints()
        {
            std::vector<std::pair<std::byte const*, std::size_t>> columns;
            for (VertexAttribute const& attribute : attributes_)
                if (attribute.isOfCorners)
                    visitArray(attribute.source->values, [&](auto const& values, auto) {
                        columns.emplace_back(reinterpret_cast<std::byte const*>(values.data), sizeof(values.data[0]));
                    });
            if (columns.empty())
                return;
            auto const hash = [&](std::uint64_t corner) {
                std::uint64_t result = (*geometry_.faceVertex)[corner];
                for (auto const& [data, bytes] : columns)
                    result = result * 31
                        + std::hash<std::string_view>()({reinterpret_cast<char const*>(data) + corner * bytes, bytes});
                return (result ^ result >> 32) * 0x9E3779B97F4A7C15u >> 16;
            };
            auto const areEqual = [&](std::uint64_t a, std::uint64_t b) {
                return (*geometry_.faceVertex)[a] == (*geometry_.faceVertex)[b]
                    && std::all_of(columns.begin(), columns.end(), [&](auto const& column) {
                           return std::memcmp(
                                      column.first + a * column.second, column.first + b * column.second, column.second)
                               == 0;
                       });
            };
            numberVertices(hash, areEqual);
            if (!vertices_.points.empty())
                geometry_.leftOut.push_back(std::to_string(vertices_.points.size)
                    + " vertices are added at points whose corners have different values: GLB files have one value "
                      "per vertex");
        }

        template <class Hash, class Equal> void numberVertices(Hash const& hash, Equal const& areEqual)
        {
            Indices const& pointOf = *geometry_.faceVertex;
            std::uint64_t const pointCount = geometry_.pointCount();
            vertices_.ofCorners = Indices(pointOf.size, Orvan::kUninitialized);
            vertices_.corners = Indices(pointCount, kInvalidIndex);
            // Open addressing: a vertex plus one, or 0. At most half is in use, even if every corner is a vertex.
            Indices slots(std::bit_ceil(2 * pointOf.size + 2));
            for (std::uint64_t corner = 0; corner < pointOf.size; ++corner) {
                std::uint64_t slot = hash(corner) & (slots.size - 1);
                while (slots[slot] != 0 && !areEqual(vertices_.corners[slots[slot] - 1], corner))
                    slot = (slot + 1) & (slots.size - 1);
                if (slots[slot] == 0)
                    slots[slot] = addVertex(pointOf[corner], static_cast<unsigned int>(corner)) + 1;
                vertices_.ofCorners[corner] = slots[slot] - 1;
            }
        }

        /// The first vertex of a point has the number of the point.
        unsigned int addVertex(unsigned int point, unsigned int corner)
        {
            if (vertices_.corners[point] == kInvalidIndex) {
                vertices_.corners[point] = corner;
                return point;
            }
            if (vertices_.corners.size + 2 >= kInvalidIndex)
                refuse("it would have more vertices than a GLB file can hold");
            vertices_.points.append(point);
            vertices_.corners.append(corner);
            return static_cast<unsigned int>(vertices_.corners.size - 1);
        }

        std::uint64_t vertexCount() const { return geometry_.pointCount() + vertices_.points.size; }
        std::uint64_t pointOf(std::uint64_t vertex) const
        {
            std::uint64_t const pointCount = geometry_.pointCount();
            return vertex < pointCount ? vertex : vertices_.points[vertex - pointCount];
        }

        // The file

        void declare()
        {
            root_ = {{"asset", {{"version", "2.0"}, {"generator", "modeling"}}}};
            if (!geometry_.remark.empty())
                root_["asset"]["extras"] = {{"remark", geometry_.remark}};
            if (geometry_.pointCount() == 0)
                return; // arrays without elements are not allowed
            OrderedJson primitive = {{"attributes", {{"POSITION", declarePositions()}}}};
            for (VertexAttribute const& attribute : attributes_)
                primitive["attributes"][attribute.semantic] = declareAttribute(attribute);
            primitive["mode"] = kPoints;
            if (geometry_.kind == WritableGeometry::Kind::Mesh && geometry_.cellCount() != 0)
                declareTriangles(primitive);
            else if (geometry_.kind == WritableGeometry::Kind::Strands)
                declareLines(primitive);
            root_["scene"] = 0;
            root_["scenes"][0]["nodes"] = OrderedJson::array({0u});
            root_["nodes"][0]["mesh"] = 0;
            root_["meshes"][0]["primitives"][0] = std::move(primitive);
            root_["buffers"][0]["byteLength"] = binaryBytes_;
        }

        /// \return the number of the accessor
        std::size_t declareArray(
            OrderedJson accessor, OrderedJson view, std::uint64_t bytes, std::function<void(OutputFile&)> write)
        {
            view["byteOffset"] = binaryBytes_;
            view["byteLength"] = bytes;
            std::uint64_t const padding = (4 - bytes % 4) % 4;
            binaryBytes_ += bytes + padding;
            blocks_.push_back([write = std::move(write), padding](OutputFile& out) {
                write(out);
                out.write("\0\0\0", padding);
            });
            accessor["bufferView"] = root_["bufferViews"].size();
            root_["bufferViews"].push_back(std::move(view));
            root_["accessors"].push_back(std::move(accessor));
            return root_["accessors"].size() - 1;
        }

        std::size_t declarePositions()
        {
            Orvan::Array<float3> const& positions = *geometry_.positions;
            float3 least = positions[0], most = positions[0];
            for (float3 const& p : positions) {
                least = {std::min(least.x, p.x), std::min(least.y, p.y), std::min(least.z, p.z)};
                most = {std::max(most.x, p.x), std::max(most.y, p.y), std::max(most.z, p.z)};
            }
            return declareArray({{"componentType", GltfScalar::Float}, {"count", vertexCount()}, {"type", "VEC3"},
                                    {"min", {least.x, least.y, least.z}}, {"max", {most.x, most.y, most.z}}},
                {{"buffer", 0}, {"target", kArrayBuffer}}, vertexCount() * sizeof(float3), [this](OutputFile& out) {
                    out.write(geometry_.positions->data, geometry_.pointCount() * sizeof(float3));
                    for (unsigned int const point : vertices_.points)
                        out.writeBinary((*geometry_.positions)[point]);
                });
        }

        std::size_t declareAttribute(VertexAttribute const& attribute)
        {
            std::string const type = attribute.components == 1 ? "SCALAR"
                : attribute.isMatrix                           ? (attribute.components == 9 ? "MAT3" : "MAT4")
                                                               : "VEC" + std::to_string(attribute.components);
            OrderedJson accessor = {{"componentType", attribute.scalar}, {"count", vertexCount()}, {"type", type}};
            if (attribute.isNormalized)
                accessor["normalized"] = true;
            std::size_t const valueBytes =
                attribute.components * visitGltfScalar(attribute.scalar, [](auto number) { return sizeof(number); });
            OrderedJson view = {{"buffer", 0}, {"target", kArrayBuffer}};
            if (attribute.stride != valueBytes)
                view["byteStride"] = attribute.stride;
            return declareArray(std::move(accessor), std::move(view), vertexCount() * attribute.stride,
                [this, &attribute, padding = attribute.stride - valueBytes, valueBytes](OutputFile& out) {
                    constexpr char kZeros[16 * sizeof(float)] = {};
                    for (std::uint64_t vertex = 0; vertex < vertexCount(); ++vertex) {
                        std::uint64_t const corner = attribute.isOfCorners ? vertices_.corners[vertex] : 0;
                        if (corner == kInvalidIndex)
                            out.write(kZeros, valueBytes); // a point of no face
                        else
                            attribute.write(attribute.isOfCorners ? corner : pointOf(vertex), out);
                        out.write(kZeros, padding);
                    }
                });
        }

        void declareTriangles(OrderedJson& primitive)
        {
            primitive["mode"] = kTriangles;
            Indices const& corners = vertices_.ofCorners.empty() ? *geometry_.faceVertex : vertices_.ofCorners;
            declareIndices(primitive, corners.size, [&corners](auto const& write) {
                for (unsigned int const vertex : corners)
                    write(vertex);
            });
        }

        /// A segment per pair of neighboring points: a strip per strand would need a primitive for each.
        void declareLines(OrderedJson& primitive)
        {
            Indices const& offset = *geometry_.offsets;
            std::uint64_t segmentCount = 0, shortCount = 0;
            for (std::uint64_t strand = 0; strand + 1 < offset.size; ++strand) {
                unsigned int const points = offset[strand + 1] - offset[strand];
                segmentCount += points < 2 ? 0 : points - 1;
                shortCount += points < 2;
            }
            if (shortCount != 0)
                geometry_.leftOut.push_back(std::to_string(shortCount)
                    + " strands with fewer than two points are left out: GLB files cannot "
                      "hold them");
            if (segmentCount == 0)
                return;
            primitive["mode"] = kLines;
            declareIndices(primitive, 2 * segmentCount, [&offset](auto const& write) {
                for (std::uint64_t strand = 0; strand + 1 < offset.size; ++strand)
                    for (unsigned int point = offset[strand]; point + 1 < offset[strand + 1]; ++point) {
                        write(point);
                        write(point + 1);
                    }
            });
        }

        /// \param forEach  Calls its parameter with each index.
        template <class ForEach>
        void declareIndices(OrderedJson& primitive, std::uint64_t count, ForEach const& forEach)
        {
            bool const isShort = vertexCount() <= std::numeric_limits<std::uint16_t>::max(); // the highest is reserved
            primitive["indices"] = declareArray(
                {{"componentType", isShort ? GltfScalar::UnsignedShort : GltfScalar::UnsignedInt}, {"count", count},
                    {"type", "SCALAR"}},
                {{"buffer", 0}, {"target", kElementArrayBuffer}},
                count * (isShort ? sizeof(std::uint16_t) : sizeof(std::uint32_t)), [isShort, forEach](OutputFile& out) {
                    forEach([&](unsigned int vertex) {
                        if (isShort)
                            out.writeBinary(static_cast<std::uint16_t>(vertex));
                        else
                            out.writeBinary(vertex);
                    });
                });
        }

        WritableGeometry& geometry_;
        std::filesystem::path const& file_;
        std::uint64_t mostBytes_;
        std::vector<VertexAttribute> attributes_;
        std::set<std::string> semantics_{"POSITION"};
        GlbVertices vertices_;
        OrderedJson root_;
        std::vector<std::function<void(OutputFile&)>> blocks_; // of the binary chunk
        std::uint64_t binaryBytes_ = 0;
    };

}

void writeGltf(WritableGeometry& geometry, std::filesystem::path const& file)
{
    writeGltf(geometry, file, std::numeric_limits<std::uint32_t>::max()); // the header has 32 bits for the size
}

void writeGltf(WritableGeometry& geometry, std::filesystem::path const& file, std::uint64_t mostBytes)
{
    GltfWriter(geometry, file, mostBytes).write();
}

}
