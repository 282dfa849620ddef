#include "GltfScene.h"
#include "Readers.h"
#include "Texts.h"
#include "Welder.h"

#include <map>
#include <set>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Tessara::Math::double3;
using Tessara::Math::float3;

namespace {

    using Json = GltfDocument::Json;
    using Indices = Orvan::Array<unsigned int>;

    enum class Mode { Points, Lines, LineLoop, LineStrip, Triangles, TriangleStrip, TriangleFan };

    bool isTriangles(Mode mode)
    {
        return mode >= Mode::Triangles;
    }

    bool isLines(Mode mode)
    {
        return mode >= Mode::Lines && mode <= Mode::LineStrip;
    }

    /// Integers are fractions of their largest value if they are normalized.
    template <class Number> double valueOf(std::byte const* bytes, bool isNormalized)
    {
        Number number;
        std::memcpy(&number, bytes, sizeof(Number));
        if constexpr (std::is_integral_v<Number>) {
            if (isNormalized)
                return std::max(-1.0, number / static_cast<double>(std::numeric_limits<Number>::max()));
        }
        return static_cast<double>(number);
    }

    /// Calls `visit(element, values)` with the three numbers of each element.
    template <class Visit> void forEachVector(GltfArray const& array, Visit const& visit)
    {
        visitGltfScalar(array.scalar, [&]<class Number>(Number) {
            array.forEach([&](std::uint64_t element, std::byte const* bytes) {
                auto const value = [&](std::size_t i) {
                    return valueOf<Number>(bytes + i * sizeof(Number), array.isNormalized);
                };
                visit(element, double3{value(0), value(1), value(2)});
            });
        });
    }

    unsigned int indexAt(std::byte const* bytes, GltfScalar scalar)
    {
        std::uint32_t index = 0;
        std::memcpy(&index, bytes,
            scalar == GltfScalar::UnsignedInt         ? sizeof(std::uint32_t)
                : scalar == GltfScalar::UnsignedShort ? sizeof(std::uint16_t)
                                                      : sizeof(std::uint8_t));
        return index; // little-endian
    }

    float3 roundedUnit(double3 const& v)
    {
        double const length = std::hypot(v.x, v.y, v.z);
        if (!(length > 0))
            return {0, 0, 0};
        return {static_cast<float>(v.x / length), static_cast<float>(v.y / length), static_cast<float>(v.z / length)};
    }

    /// The values of a property for all vertices read so far; zero for those without any.
    struct Column {
        std::string name;
        GltfScalar scalar;
        unsigned int components;
        bool isMatrix;
        std::size_t elementBytes;
        Orvan::Array<unsigned char> bytes = {};
        std::uint64_t filledCount = 0;
    };

    /// A run of vertices, which primitives share if they have the same attributes.
    struct Vertices {
        std::uint64_t first = 0;
        std::uint64_t count = 0;
    };

    class GltfReader {
    public:
        GltfReader(InputFile const& file, ReadOptions const& options)
            : document_(file)
            , builder_(document_, options)
        {
        }

        GeometryFile read()
        {
            std::vector<GltfInstance> const instances = collectInstances(document_);
            chooseKind(instances);
            for (GltfInstance const& instance : instances)
                readInstance(instance);
            requireMemory(strandPoints_.size * sizeof(float3));
            if (kind_ == Mode::Lines)
                addStrands();
            for (Column& column : columns_)
                addProperty(column);
            addSources();
            noteVertices();
            noteLeftOut(instances);
            return std::move(builder_).finish(document_.isBinary() ? "glTF (binary)" : "glTF (text)");
        }

    private:
        Mode modeOf(Json const& primitive) const
        {
            std::uint64_t const mode =
                document_.findNumber(primitive, "mode").value_or(static_cast<std::uint64_t>(Mode::Triangles));
            if (mode > static_cast<std::uint64_t>(Mode::TriangleFan))
                document_.refuse("mode " + std::to_string(mode) + " does not exist");
            return static_cast<Mode>(mode);
        }

        static Mode kindOf(Mode mode)
        {
            return isTriangles(mode) ? Mode::Triangles : isLines(mode) ? Mode::Lines : Mode::Points;
        }

        void goTo(std::uint64_t mesh, std::uint64_t primitive)
        {
            document_.at("mesh " + std::to_string(mesh) + ", primitive " + std::to_string(primitive));
        }

        /// The primitives of a mesh, which are objects with a mode.
        Json const& primitivesOf(std::uint64_t mesh)
        {
            document_.at("mesh " + std::to_string(mesh));
            Json const& primitives = document_.listIn(document_.item("meshes", mesh), "primitives");
            for (std::uint64_t primitive = 0; primitive < primitives.size(); ++primitive) {
                goTo(mesh, primitive);
                if (!primitives[primitive].is_object())
                    document_.refuse("it is not an object");
                static_cast<void>(modeOf(primitives[primitive]));
            }
            return primitives;
        }

        /// The attributes of a primitive; null without positions.
        static Json const* attributesOf(Json const& primitive)
        {
            auto const attributes = primitive.find("attributes");
            bool const hasPositions =
                attributes != primitive.end() && attributes->is_object() && attributes->contains("POSITION");
            return hasPositions ? &*attributes : nullptr;
        }

        /// Equal for equal attributes. (Writing JSON as text is recursive, and the values may be nested without end.)
        std::string keyOf(Json const& attributes) const
        {
            std::string key;
            for (auto const& [semantic, accessor] : attributes.items())
                key += std::to_string(document_.number(attributes, semantic.c_str())) + " "
                    + std::to_string(semantic.size()) + " " + semantic;
            return key;
        }

        struct MeshSize {
            std::uint64_t primitives = 0;
            std::uint64_t vertices = 0; // of triangles
            std::uint64_t corners = 0;
        };

        MeshSize measure(std::uint64_t mesh)
        {
            Json const& primitives = primitivesOf(mesh);
            MeshSize size{primitives.size()};
            std::set<std::uint64_t> counted;
            for (std::uint64_t number = 0; number < primitives.size(); ++number) {
                Json const& primitive = primitives[number];
                Mode const mode = modeOf(primitive);
                kind_ = std::max(kind_, kindOf(mode));
                Json const* const attributes = attributesOf(primitive);
                if (!isTriangles(mode) || !attributes)
                    continue;
                goTo(mesh, number);
                std::uint64_t const positions = document_.number(*attributes, "POSITION");
                std::uint64_t const vertexCount = document_.array(positions).count;
                size.vertices += counted.insert(positions).second ? vertexCount : 0;
                hasAttributes_ = hasAttributes_ || attributes->size() > 1;
                auto const indices = document_.findNumber(primitive, "indices");
                std::uint64_t const count = indices ? document_.array(*indices).count : vertexCount;
                size.corners += mode == Mode::Triangles ? count : count < 3 ? 0 : 3 * (count - 2);
            }
            return size;
        }

        /// Faces if there are any, otherwise lines, otherwise points. Reserves the memory for faces.
        void chooseKind(std::vector<GltfInstance> const& instances)
        {
            constexpr std::uint64_t kMostPrimitives = 1 << 24; // instances may multiply a small file without end
            std::map<std::uint64_t, MeshSize> sizes;
            MeshSize total;
            for (GltfInstance const& instance : instances) {
                auto const [known, isNew] = sizes.try_emplace(instance.mesh);
                if (isNew)
                    known->second = measure(instance.mesh);
                total.primitives += known->second.primitives;
                total.vertices += known->second.vertices;
                total.corners += known->second.corners;
                if (total.primitives > kMostPrimitives)
                    document_.refuse("the scene has more than 16,777,216 primitives");
                if (std::max(total.vertices, total.corners) >= GeometryBuilder::kMostElements)
                    document_.refuse("the scene has more points or face corners than a mesh can hold");
            }
            constexpr std::uint64_t kVertexBytes = sizeof(float3) + 4 * sizeof(unsigned int);
            constexpr std::uint64_t kCornerBytes = 4 * sizeof(unsigned int);
            requireMemory(total.vertices * kVertexBytes + total.corners * kCornerBytes);
            pointOf_.reserve(total.vertices);
            builder_.expectFaces(total.corners / 3);
            builder_.expectCorners(total.corners);
            vertexOfCorner_.reserve(hasAttributes_ ? total.corners : 0);
        }

        /// Instances and attributes without data may demand much more memory than the file has bytes.
        void requireMemory(std::uint64_t bytes) const
        {
            constexpr std::uint64_t kNoticedBytes = 1 << 20;
            if (bytes >= kNoticedBytes && builder_.options().onSize)
                builder_.options().onSize(bytes);
        }

        void readInstance(GltfInstance const& instance)
        {
            Json const& primitives = primitivesOf(instance.mesh);
            // Primitives with different materials often share their vertices.
            std::map<std::string, Vertices> knownVertices;
            Welder<float3> welder;
            std::uint64_t const firstPoint = builder_.pointCount();
            for (std::uint64_t number = 0; number < primitives.size(); ++number) {
                goTo(instance.mesh, number);
                Json const& primitive = primitives[number];
                Mode const mode = modeOf(primitive);
                if (kindOf(mode) != kind_) {
                    ++otherPrimitives_[static_cast<std::size_t>(kindOf(mode))];
                    continue;
                }
                morphTargets_ += document_.listIn(primitive, "targets").size();
                Json const* const attributes = attributesOf(primitive);
                if (!attributes) {
                    ++withoutPositions_;
                    continue;
                }
                auto const [known, isNew] = knownVertices.try_emplace(keyOf(*attributes));
                Vertices& vertices = known->second;
                if (isNew) {
                    vertices.first = pointOf_.size;
                    vertices.count = readPositions(*attributes, instance.transform, firstPoint, welder);
                    for (auto const& [semantic, accessor] : attributes->items())
                        if (semantic != "POSITION")
                            readAttribute(semantic, *attributes, vertices, instance.transform);
                }
                readElements(primitive, mode, vertices, instance.transform.determinant() < 0);
                endSource();
            }
        }

        std::uint64_t readPositions(
            Json const& attributes, GltfTransform const& transform, std::uint64_t firstPoint, Welder<float3>& welder)
        {
            GltfArray const positions = document_.array(document_.number(attributes, "POSITION"));
            if (positions.components != 3)
                document_.refuse("POSITION has " + std::to_string(positions.components) + " numbers instead of 3");
            if (!positions.data && positions.replacedCount == 0)
                document_.refuse("POSITION has no data; compressed geometry is not supported");
            if (pointOf_.size + positions.count >= GeometryBuilder::kMostElements)
                document_.refuse("there are more points than a mesh can hold");
            bool const isMoved = !transform.isIdentity();
            bool const isExact = !isMoved && positions.scalar == GltfScalar::Float;
            double const tolerance = isExact ? 0 : kReportedFraction * reachOf(positions, transform);
            forEachVector(positions, [&](std::uint64_t, double3 const& local) {
                std::uint64_t point = builder_.pointCount();
                if (kind_ == Mode::Triangles)
                    point = firstPoint
                        + welder.numberOfPosition(
                            {static_cast<float>(local.x), static_cast<float>(local.y), static_cast<float>(local.z)});
                if (point == builder_.pointCount()) {
                    double3 const p = isMoved ? transform.apply(local) : local;
                    auto const coordinate = [&](double value) {
                        return Coordinate{value, std::abs(value - static_cast<float>(value)) > tolerance};
                    };
                    builder_.addPoint(coordinate(p.x), coordinate(p.y), coordinate(p.z));
                    firstVertexOf_.append(static_cast<unsigned int>(pointOf_.size));
                }
                pointOf_.append(static_cast<unsigned int>(point));
            });
            return positions.count;
        }

        /// The largest coordinate after the linear part of a transform.
        static double reachOf(GltfArray const& positions, GltfTransform transform)
        {
            std::fill(std::begin(transform.translation), std::end(transform.translation), 0.0);
            double reach = 0;
            forEachVector(positions, [&](std::uint64_t, double3 const& local) {
                double3 const p = transform.apply(local);
                reach = std::max({reach, std::abs(p.x), std::abs(p.y), std::abs(p.z)});
            });
            return reach;
        }

        /// The name of the property; empty if the attribute is left out.
        static std::string propertyName(std::string const& semantic)
        {
            auto const numbered = [&](std::string_view prefix, std::string_view name) {
                if (!semantic.starts_with(prefix))
                    return std::string();
                std::string const number = semantic.substr(prefix.size());
                return std::string(name) + (number == "0" ? "" : number);
            };
            if (semantic.starts_with('_'))
                return semantic.size() == 1 ? semantic : semantic.substr(1);
            if (semantic == "NORMAL")
                return "normal";
            std::string const texture = numbered("TEXCOORD_", "uv");
            return texture.empty() ? numbered("COLOR_", "color") : texture;
        }

        void readAttribute(std::string const& semantic, Json const& attributes, Vertices const& vertices,
            GltfTransform const& transform)
        {
            std::string const name = propertyName(semantic);
            if (name.empty()) {
                leftOutAttributes_.add(semantic);
                return;
            }
            GltfArray const array = document_.array(document_.number(attributes, semantic.c_str()));
            if (array.count != vertices.count)
                document_.refuse(semantic + " has " + std::to_string(array.count) + " elements, but POSITION has "
                    + std::to_string(vertices.count));
            bool const isNormal = semantic == "NORMAL", isTexture = semantic.starts_with("TEXCOORD_");
            if ((isNormal && array.components != 3) || (isTexture && array.components != 2))
                document_.refuse(semantic + " has a wrong number of components");
            std::optional<Column> const type =
                typeOf(name, array, isNormal || isTexture, semantic.starts_with("COLOR_"));
            if (!type) {
                leftOutAttributes_.add(semantic);
                return;
            }
            auto const [known, isNew] = columnOf_.try_emplace(semantic, columns_.size());
            if (isNew)
                columns_.push_back(*type);
            Column& column = columns_[known->second];
            if (column.scalar != type->scalar || column.components != type->components
                || column.isMatrix != type->isMatrix) {
                otherTypes_.add(semantic);
                return;
            }
            std::uint64_t const end = (vertices.first + vertices.count) * column.elementBytes;
            if (end > column.bytes.capacity)
                requireMemory(std::max(column.bytes.capacity, end - column.bytes.capacity)); // how arrays grow
            column.bytes.resize(end);
            column.filledCount += vertices.count;
            unsigned char* const target = column.bytes.data + vertices.first * column.elementBytes;
            if (isNormal && !transform.isIdentity())
                storeNormals(array, transform.forNormals(), target);
            else
                store(array, column, target);
        }

        /// A column without values. Integers keep their type if they are not normalized or the bytes of a color, and if
        /// a property can have the type.
        static std::optional<Column> typeOf(std::string const& name, GltfArray const& array, bool isFloat, bool isColor)
        {
            if (array.isMatrix && array.components == 4)
                return std::nullopt; // would be read as a vector of four
            bool const isByteColor = isColor && array.scalar == GltfScalar::UnsignedByte;
            GltfScalar scalar = GltfScalar::Float;
            if (!isFloat && (!array.isNormalized || isByteColor)) {
                bool const exists = visitGltfScalar(array.scalar,
                    [&]<class Number>(Number) { return visitElementTypeOf<Number>(array.components, [](auto) {}); });
                if (!exists && array.scalar == GltfScalar::UnsignedInt)
                    return std::nullopt; // a float loses digits
                scalar = exists ? array.scalar : GltfScalar::Float;
            }
            std::size_t const bytes =
                array.components * visitGltfScalar(scalar, [](auto number) { return sizeof(number); });
            return Column{name, scalar, array.components, array.isMatrix, bytes};
        }

        static void storeNormals(GltfArray const& array, GltfTransform const& transform, unsigned char* target)
        {
            forEachVector(array, [&](std::uint64_t element, double3 const& normal) {
                float3 const moved = roundedUnit(transform.apply(normal));
                std::memcpy(target + element * sizeof(float3), &moved, sizeof(float3));
            });
        }

        static void store(GltfArray const& array, Column const& column, unsigned char* target)
        {
            if (array.isMatrix) { // column by column in the file
                std::size_t const side = array.components == 9 ? 3 : 4;
                array.forEach([&](std::uint64_t element, std::byte const* bytes) {
                    for (std::size_t i = 0; i < array.components; ++i)
                        std::memcpy(target + (element * array.components + i % side * side + i / side) * sizeof(float),
                            bytes + i * sizeof(float), sizeof(float));
                });
                return;
            }
            if (array.scalar == column.scalar) {
                array.forEach([&](std::uint64_t element, std::byte const* bytes) {
                    std::memcpy(target + element * column.elementBytes, bytes, column.elementBytes);
                });
                return;
            }
            visitGltfScalar(array.scalar, [&]<class Number>(Number) {
                array.forEach([&](std::uint64_t element, std::byte const* bytes) {
                    for (std::size_t i = 0; i < array.components; ++i) {
                        auto const value =
                            static_cast<float>(valueOf<Number>(bytes + i * sizeof(Number), array.isNormalized));
                        std::memcpy(target + (element * array.components + i) * sizeof(float), &value, sizeof(float));
                    }
                });
            });
        }

        /// Checks the indices of a primitive.
        GltfArray indices(std::uint64_t accessor, std::uint64_t vertexCount)
        {
            GltfArray const array = document_.array(accessor);
            bool const isUnsigned = array.scalar == GltfScalar::UnsignedByte
                || array.scalar == GltfScalar::UnsignedShort || array.scalar == GltfScalar::UnsignedInt;
            if (array.components != 1 || !isUnsigned)
                document_.refuse("the indices are not unsigned integers");
            array.forEach([&](std::uint64_t element, std::byte const* bytes) {
                std::uint64_t const vertex = indexAt(bytes, array.scalar);
                if (vertex >= vertexCount)
                    document_.refuse("index " + std::to_string(element) + " refers to vertex " + std::to_string(vertex)
                        + ", but there are " + std::to_string(vertexCount) + ", counted from 0");
            });
            return array;
        }

        void readElements(Json const& primitive, Mode mode, Vertices const& run, bool isMirrored)
        {
            auto const accessor = document_.findNumber(primitive, "indices");
            if (mode == Mode::Points) {
                withIndices_ += accessor ? 1 : 0;
                return;
            }
            auto const read = [&](std::uint64_t count, auto const& vertex) {
                if (isLines(mode))
                    readLines(mode, count, vertex);
                else
                    readTriangles(mode, isMirrored, count, vertex);
            };
            auto const first = static_cast<unsigned int>(run.first);
            if (!accessor) {
                read(run.count, [=](std::uint64_t i) { return first + static_cast<unsigned int>(i); });
                return;
            }
            GltfArray const array = indices(*accessor, run.count);
            requireMemory((strandPoints_.capacity + array.count) * sizeof(unsigned int));
            if (array.data && array.replacedCount == 0) {
                read(array.count,
                    [=](std::uint64_t i) { return first + indexAt(array.data + i * array.stride, array.scalar); });
                return;
            }
            Indices vertices;
            array.forEach(
                [&](std::uint64_t, std::byte const* bytes) { vertices.append(first + indexAt(bytes, array.scalar)); });
            read(vertices.size, [&](std::uint64_t i) { return vertices[i]; });
        }

        template <class Vertex>
        void readTriangles(Mode mode, bool isMirrored, std::uint64_t count, Vertex const& vertex)
        {
            auto const add = [&](unsigned int a, unsigned int b, unsigned int c) {
                for (unsigned int const corner : {a, isMirrored ? c : b, isMirrored ? b : c}) {
                    builder_.addCorner(pointOf_[corner]);
                    if (hasAttributes_)
                        vertexOfCorner_.append(corner);
                }
                builder_.endFace();
            };
            if (mode == Mode::Triangles) {
                incomplete_ += count % 3;
                for (std::uint64_t i = 0; i + 2 < count; i += 3)
                    add(vertex(i), vertex(i + 1), vertex(i + 2));
                return;
            }
            incomplete_ += count < 3 ? count : 0;
            for (std::uint64_t i = 0; i + 2 < count; ++i) {
                bool const isStrip = mode == Mode::TriangleStrip;
                unsigned int const a = isStrip ? vertex(i) : vertex(i + 1);
                unsigned int const b = isStrip ? vertex(i + 1 + i % 2) : vertex(i + 2);
                unsigned int const c = isStrip ? vertex(i + 2 - i % 2) : vertex(0);
                if (a == b || b == c || c == a)
                    ++joints_; // strips repeat vertices to continue elsewhere
                else
                    add(a, b, c);
            }
        }

        /// Segments that begin where the last one ended continue its strand.
        template <class Vertex> void readLines(Mode mode, std::uint64_t count, Vertex const& vertex)
        {
            auto const endStrand = [&] {
                if (strandPoints_.size >= GeometryBuilder::kMostElements)
                    document_.refuse("the lines have more points than a strand set can hold");
                if (strandPoints_.size != strandOffset_[strandOffset_.size - 1])
                    strandOffset_.append(static_cast<unsigned int>(strandPoints_.size));
            };
            std::uint64_t const used = mode == Mode::Lines ? count - count % 2 : count < 2 ? 0 : count;
            incomplete_ += count - used;
            for (std::uint64_t i = 0; i < used; ++i) {
                bool const isStart = mode == Mode::Lines && i % 2 == 0;
                if (isStart && i != 0 && vertex(i) == vertex(i - 1))
                    continue;
                if (isStart)
                    endStrand();
                strandPoints_.append(vertex(i));
            }
            if (mode == Mode::LineLoop && used != 0)
                strandPoints_.append(vertex(0));
            endStrand();
        }

        /// Numbers the elements of a primitive.
        void endSource()
        {
            std::uint64_t const end = kind_ == Mode::Triangles ? builder_.faceCount()
                : kind_ == Mode::Lines                         ? strandOffset_.size - 1
                                                               : builder_.pointCount();
            std::uint64_t const begin = sources_.size;
            sources_.resize(end, Orvan::kUninitialized);
            std::fill(sources_.data + begin, sources_.data + end, sourceCount_);
            ++sourceCount_;
        }

        void addSources()
        {
            if (sourceCount_ < 2)
                return;
            builder_.addProperty<int>("source",
                kind_ == Mode::Triangles   ? sFaceComp
                    : kind_ == Mode::Lines ? sStrandComp
                                           : sPointComp,
                std::move(sources_));
        }

        void addStrands()
        {
            std::vector<bool> isUsed(builder_.pointCount());
            for (unsigned int const point : strandPoints_)
                isUsed[point] = true;
            auto const usedCount = static_cast<std::uint64_t>(std::count(isUsed.begin(), isUsed.end(), true));
            noteCount(isUsed.size() - usedCount, " points of no line are left out");
            noteCount(strandPoints_.size - usedCount, " points are duplicated, because each strand has its own points");
            builder_.makeStrands(std::move(strandOffset_), strandPoints_);
        }

        void addProperty(Column& column)
        {
            noteCount(pointOf_.size - column.filledCount, " vertices have no \"" + column.name + "\" and get zeros");
            column.bytes.resize(pointOf_.size * column.elementBytes);
            if (kind_ != Mode::Triangles)
                gather(column, sPointComp, kind_ == Mode::Lines ? strandPoints_ : firstVertexOf_);
            else if (agreesAtPoints(column))
                gather(column, sPointComp, firstVertexOf_);
            else
                gather(column, sFaceVertexComp, vertexOfCorner_);
            column.bytes = {};
        }

        /// Whether vertices that became one point have the same value.
        bool agreesAtPoints(Column const& column) const
        {
            for (std::uint64_t vertex = 0; vertex < pointOf_.size; ++vertex) {
                std::uint64_t const first = firstVertexOf_[pointOf_[vertex]];
                if (first != vertex
                    && std::memcmp(column.bytes.data + vertex * column.elementBytes,
                           column.bytes.data + first * column.elementBytes, column.elementBytes)
                        != 0)
                    return false;
            }
            return true;
        }

        void gather(Column const& column, char const* component, Indices const& vertices)
        {
            requireMemory(vertices.size * column.elementBytes);
            visitGltfScalar(column.scalar, [&]<class Number>(Number) {
                auto const target =
                    builder_.addProperty<Number>(column.name, component, column.components, vertices.size);
                for (std::uint64_t i = 0; i < vertices.size; ++i)
                    std::memcpy(target->data + i * column.elementBytes,
                        column.bytes.data + vertices[i] * column.elementBytes, column.elementBytes);
            });
        }

        void noteCount(std::uint64_t count, std::string const& what)
        {
            if (count != 0)
                builder_.note(std::to_string(count) + what);
        }

        void noteVertices()
        {
            noteCount(pointOf_.size - firstVertexOf_.size,
                " vertices become one point with another one of their mesh at the same position; attributes in which "
                "they differ become attributes of corners");
            noteCount(joints_, " triangles with repeated vertices in strips and fans are left out");
            noteCount(incomplete_, " vertices of incomplete triangles or lines are left out");
            noteCount(withIndices_, " lists of indices of points are left out: every point is kept");
        }

        void noteLeftOut(std::vector<GltfInstance> const& instances)
        {
            noteCount(otherPrimitives_[static_cast<std::size_t>(Mode::Points)], " primitives of points are left out");
            noteCount(otherPrimitives_[static_cast<std::size_t>(Mode::Lines)],
                " primitives of lines are left out, because a mesh has none");
            noteCount(withoutPositions_, " primitives without positions are left out");
            noteCount(morphTargets_, " morph targets are left out");
            if (!leftOutAttributes_.empty())
                builder_.note("attributes are left out: " + leftOutAttributes_.countedList());
            if (!otherTypes_.empty())
                builder_.note("attributes of primitives that have another type elsewhere are left out: "
                    + otherTypes_.countedList());
            for (char const* const list : {"materials", "textures", "animations", "skins", "cameras"})
                noteCount(document_.list(list).size(), std::string(" ") + list + " are left out");
            Texts extensions;
            for (Json const& extension : document_.list("extensionsUsed"))
                if (extension != "KHR_mesh_quantization") // only allows more types of numbers
                    extensions.add(extension.is_string() ? extension.get<std::string>() : std::string());
            if (!extensions.empty())
                builder_.note("extensions are left out: " + extensions.countedList());
            std::vector<bool> isPlaced(document_.list("meshes").size());
            for (GltfInstance const& instance : instances)
                isPlaced[instance.mesh] = true;
            noteCount(static_cast<std::uint64_t>(std::count(isPlaced.begin(), isPlaced.end(), false)),
                " meshes outside the scene are left out");
            noteCount(document_.bytesLeft(), " bytes after the end are left out");
        }

        static constexpr double kReportedFraction = 1e-6; // of the size of a mesh

        GltfDocument document_;
        GeometryBuilder builder_;
        Mode kind_ = Mode::Points; // Points, Lines or Triangles
        Indices pointOf_; // one entry per vertex
        Indices firstVertexOf_; // one entry per point
        bool hasAttributes_ = false; // besides positions, at faces
        Indices vertexOfCorner_; // only if there are such attributes
        Indices strandPoints_;
        Indices strandOffset_{0u};
        Orvan::Array<int> sources_; // one entry per face, strand, or point of a cloud
        int sourceCount_ = 0;
        std::vector<Column> columns_;
        std::map<std::string, std::size_t> columnOf_; // by the name of the attribute in the file
        std::uint64_t otherPrimitives_[static_cast<std::size_t>(Mode::TriangleFan) + 1] = {};
        std::uint64_t withoutPositions_ = 0;
        std::uint64_t morphTargets_ = 0;
        std::uint64_t joints_ = 0;
        std::uint64_t incomplete_ = 0;
        std::uint64_t withIndices_ = 0;
        Texts leftOutAttributes_;
        Texts otherTypes_;
    };

}

GeometryFile readGltf(InputFile const& file, ReadOptions const& options)
{
    return GltfReader(file, options).read();
}

}
