#pragma once

#include "ElementLayout.h"
#include "Scanner.h"
#include "UnusableElements.h"

#include <TessaraGeometry/Makers.h>
#include <TessaraGeometry/Names.h>

#include <cmath>
#include <optional>
#include <string_view>

namespace ModelingProgram {

/// The prefix of properties whose name another component uses too: "face:color" is the color of the faces if points
/// have a color. Empty for components that files do not distinguish.
std::string_view namePrefix(Orvan::String const& component);

/// "points", "faces", "corners" or "strands"; of any other component its name.
std::string elementNames(Orvan::String const& component);

/// Whether the name is reserved for the geometry itself.
bool isReservedName(std::string_view name);

/// Optional entry of a data property: the names that its components had as columns of a file, separated by spaces, so
/// that they are written under the same names.
inline constexpr char const* sColumnNames = "columnNames";

/// What the name of a range of faces is extended by to name its data, the names of the faces.
inline constexpr char const* kNameSuffix = "_name";

/// What a coordinate loses in single precision.
inline double lossOf(double value)
{
    return std::abs(value - static_cast<double>(static_cast<float>(value)));
}

/// A point near the middle of the positions with few digits, so that it can be read, typed and added back: its
/// coordinates are multiples of a power of ten about as large as the box of the positions. `wide` has the same positions
/// in double precision; those that are not finite in single precision do not count.
Tessara::Math::double3 roundedCenterOf(
    Orvan::Array<Tessara::Math::float3> const& positions, Orvan::Array<Tessara::Math::double3> const& wide);

/// The values at these indices; zero for `kInvalidIndex`.
template <class T> Orvan::Array<T> gathered(Orvan::Array<T> const& values, Orvan::Array<unsigned int> const& indices)
{
    Orvan::Array<T> result(indices.size, Orvan::kUninitialized);
    std::transform(indices.begin(), indices.end(), result.begin(),
        [&](unsigned int index) { return index == Tessara::Geometry::kInvalidIndex ? T{} : values[index]; });
    return result;
}

/// The memory for the values of a new property, to be filled in.
struct PropertyValues {
    std::byte* data;
    std::size_t elementBytes;
};

/// Collects and checks what a reader finds. All readers use it, so that all formats accept the same geometry.
class GeometryBuilder {
    using float3 = Tessara::Math::float3;

public:
    /// Refusals are thrown by the scanner, which must be at the position of what is added.
    GeometryBuilder(Scanner const& scanner, ReadOptions const& options)
        : scanner_(scanner)
        , options_(options)
    {
    }

    ReadOptions const& options() const { return options_; }
    /// Whether positions are translated before they are rounded to single precision.
    bool movesPositions() const { return options_.isCentered || options_.origin; }

    /// For counts that are known and checked against the size of the file. Corners may then refer to points that come
    /// later.
    void expectPoints(std::uint64_t count);
    /// The same without room for them, if other builders read them.
    void expectOtherPoints(std::uint64_t count);
    void expectFaces(std::uint64_t count) { raw_.faceOffset.reserve(count + 1); }
    void expectCorners(std::uint64_t count) { raw_.faceVertex.reserve(count); }

    void addPoint(Coordinate const& x, Coordinate const& y, Coordinate const& z)
    {
        float3 const position{static_cast<float>(x.value), static_cast<float>(y.value), static_cast<float>(z.value)};
        raw_.positions.append(position);
        if (!isFinite(position))
            addNotFinitePoint();
        else if (x.losesDigits || y.losesDigits || z.losesDigits)
            addLoss(x.value, y.value, z.value);
        if (movesPositions())
            widePositions_.append({x.value, y.value, z.value});
        pointCount_ = std::max(pointCount_, raw_.positions.size);
    }
    void addPoint(float3 const& position) { addPoint({position.x}, {position.y}, {position.z}); }

    template <class Index> void addCorner(Index point)
    {
        if (std::cmp_less(point, 0) || std::cmp_greater_equal(point, pointCount_))
            refuseIndex("face", std::to_string(point));
        raw_.faceVertex.append(static_cast<unsigned int>(point));
    }

    void endFace()
    {
        if (raw_.faceVertex.size - raw_.faceOffset[raw_.faceOffset.size - 1] < 3)
            addShortFace();
        if (raw_.faceVertex.size >= kMostElements)
            scanner_.refuse("there are more face corners than a mesh can hold");
        raw_.faceOffset.append(static_cast<unsigned int>(raw_.faceVertex.size));
    }

    /// Adds all points at once instead.
    /// \param widePositions  the same in double precision; only if positions are moved
    /// \param largestLoss    of a coordinate that is not a float, and 0 if there is none
    /// \pre  all are finite in single precision
    void setPoints(
        Orvan::Array<float3> positions, Orvan::Array<Tessara::Math::double3> widePositions, double largestLoss);
    /// Adds all faces at once instead.
    /// \pre  the faces have at least three corners each, fewer than `kMostElements` in total, and refer to points
    void setFaces(Orvan::Array<unsigned int> faceVertex, Orvan::Array<unsigned int> faceOffset);
    /// Takes the points and faces of builders that have read consecutive parts of the file, all of them. Properties are
    /// not taken.
    void join(std::vector<GeometryBuilder*> const& parts);
    /// Removes all points whose new number is below `first`, and gives the corners the new numbers of their points.
    /// \param numbers      ascend from `first` on for the points that are kept
    /// \param largestLoss  of a coordinate of these points
    void keepNewPoints(Orvan::Array<unsigned int> const& numbers, unsigned int first, double largestLoss);

    /// The number of points that corners may refer to.
    std::uint64_t expectedPointCount() const { return pointCount_; }

    /// Makes a strand set of these points, in this order. The offsets are the starts of the strands and the end of the
    /// last. Properties of points that are added later refer to the new points.
    void makeStrands(Orvan::Array<unsigned int> offsets, Orvan::Array<unsigned int> const& points);

    /// Whether there are elements that `finish` leaves out, because reading is lenient.
    bool hasUnusableElements() const { return hasUnusableElements_; }

    std::uint64_t pointCount() const { return raw_.positions.size; }
    Orvan::Array<float3> const& positions() const { return raw_.positions; }
    /// In double precision; only if positions are translated.
    Orvan::Array<Tessara::Math::double3> const& widePositions() const { return widePositions_; }
    std::uint64_t cornerCount() const { return raw_.faceVertex.size; }
    std::uint64_t faceCount() const { return raw_.faceOffset.size - 1; }
    Orvan::Array<unsigned int> const& faceOffset() const { return raw_.faceOffset; }

    /// Adds a property under this name, with the prefix of its component if the name is taken.
    template <class T> void addProperty(
        std::string const& name, char const* component, Orvan::Array<T> values, std::string const& columnNames = {})
    {
        addShared<T>(name, component, Orvan::makePtr<Orvan::Array<T>>(std::move(values)), columnNames);
    }

    /// The same for a type known only from the file: values of `components` scalars, to be filled in before `finish`.
    /// Returns nullopt if there is no such element type.
    template <class Scalar> std::optional<PropertyValues> addProperty(std::string const& name, char const* component,
        std::uint64_t components, std::uint64_t count, std::string const& columnNames = {})
    {
        std::optional<PropertyValues> result;
        visitElementTypeOf<Scalar>(components, [&]<class T>(Tessara::Geometry::ElementType<T>) {
            auto values = Orvan::MutablePtr<Orvan::Array<T>>::make(count);
            result = PropertyValues{reinterpret_cast<std::byte*>(values->data), sizeof(T)};
            addShared<T>(name, component, std::move(values), columnNames);
        });
        return result;
    }

    /// Adds names of faces, one number of a name per face: a range property with this name, and the names as the data of
    /// this range. So each name is stored once, however many faces have it.
    void addFaceNames(std::string name, Orvan::Array<unsigned int> numbers, Orvan::Array<Orvan::String> names)
    {
        faceNames_.push_back({std::move(name), std::move(numbers), std::move(names)});
    }

    void note(std::string sentence) { notes_.push_back(std::move(sentence)); }
    /// Adds a note if the scanner has not reached the end of the file.
    void noteBytesLeft();

    /// The geometry. Properties of faces and corners are dropped if there are no faces, those of strands likewise.
    GeometryFile finish(std::string format) &&;

    static constexpr std::uint64_t kMostElements = Tessara::Geometry::kDeletedElement;

private:
    struct Property {
        std::string name;
        char const* component;
        Orvan::MutablePtr<Tessara::Object> object;
    };

    struct FaceNames {
        std::string name;
        Orvan::Array<unsigned int> numbers;
        Orvan::Array<Orvan::String> names;
    };

    template <class T> void addShared(std::string const& name, char const* component,
        Orvan::Ptr<Orvan::Array<T>> values, std::string const& columnNames)
    {
        auto property = Tessara::Geometry::makeDataProperty<T>(component, std::move(values));
        if (!columnNames.empty())
            property->setProperty(sColumnNames, Orvan::String(columnNames));
        properties_.push_back({name, component, std::move(property)});
    }

    void addNotFinitePoint();
    void addLoss(double x, double y, double z);
    void addShortFace();
    [[noreturn]] void refuseIndex(char const* element, std::string const& index) const;
    std::optional<Tessara::Math::double3> movePositions();
    void noteLostDigits();
    Orvan::MutablePtr<Tessara::Object> makeObject();
    void addProperties(Tessara::Object& object);

    Scanner const& scanner_;
    ReadOptions options_;
    std::uint64_t pointCount_ = 0; // expected, or the actual one
    RawGeometry raw_;
    Orvan::Array<Tessara::Math::double3> widePositions_; // as in the file; only if positions are translated
    double largestLoss_ = 0; // of coordinates that lose digits
    bool hasUnusableElements_ = false;
    std::vector<Property> properties_;
    std::vector<FaceNames> faceNames_;
    std::vector<std::string> notes_;
};

}
