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

/// How files call the properties of a component's elements that share their name with another component's: "face:color"
/// is the color of the faces, where points have a color too. Empty for components that no file tells apart.
std::string_view namePrefix(Orvan::String const& component);

/// "points", "faces", "corners" or "strands"; of any other component its name.
std::string elementNames(Orvan::String const& component);

/// Whether geometry itself is stored under the name, so that no other property can be.
bool isReservedName(std::string_view name);

/// A data property may hold, beside what the conventions ask for, the names that its components had as columns of a
/// file, separated by blanks: so it goes back under the same names.
inline constexpr char const* sColumnNames = "columnNames";

/// The values at these indices; zero for `kInvalidIndex`.
template <class T> Orvan::Array<T> gathered(Orvan::Array<T> const& values, Orvan::Array<unsigned int> const& indices)
{
    Orvan::Array<T> result(indices.size, Orvan::kUninitialized);
    std::transform(indices.begin(), indices.end(), result.begin(),
        [&](unsigned int index) { return index == Tessara::Geometry::kInvalidIndex ? T{} : values[index]; });
    return result;
}

/// Where the values of a new property lie, to be filled in.
struct PropertyValues {
    std::byte* data;
    std::size_t elementBytes;
};

/// Takes in what a reader finds, and checks it on the way: the one place that decides which geometry is accepted.
class GeometryBuilder {
    using float3 = Tessara::Math::float3;

public:
    /// Refusals are said through the scanner, which therefore stands at what is handed in.
    GeometryBuilder(Scanner const& scanner, ReadOptions const& options)
        : scanner_(scanner)
        , options_(options)
    {
    }

    ReadOptions const& options() const { return options_; }
    /// Positions are moved before they become single precision.
    bool movesPositions() const { return options_.isCentered || options_.origin; }

    /// For counts that are known, and that the file can hold: corners may then name points that come later.
    void expectPoints(std::uint64_t count);
    void expectFaces(std::uint64_t count) { raw_.faceOffset.reserve(count + 1); }

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

    /// Makes these points, in this order, a strand set; the offsets say where its strands begin and the last one ends.
    /// Properties of the points are handed in for the points as they are then.
    void makeStrands(Orvan::Array<unsigned int> offsets, Orvan::Array<unsigned int> const& points);

    std::uint64_t pointCount() const { return raw_.positions.size; }
    std::uint64_t cornerCount() const { return raw_.faceVertex.size; }
    std::uint64_t faceCount() const { return raw_.faceOffset.size - 1; }
    Orvan::Array<unsigned int> const& faceOffset() const { return raw_.faceOffset; }

    /// Adds a property under this name, or under a name of its component where the name is taken.
    template <class T> void addProperty(
        std::string const& name, char const* component, Orvan::Array<T> values, std::string const& columnNames = {})
    {
        addShared<T>(name, component, Orvan::makePtr<Orvan::Array<T>>(std::move(values)), columnNames);
    }

    /// The same for a type that only the file knows: values of so many scalars, to be filled in before `finish`.
    /// Nothing where no element type is like that.
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

    void note(std::string sentence) { notes_.push_back(std::move(sentence)); }
    /// Notes what the scanner has not reached, if there is anything.
    void noteBytesLeft();

    /// The geometry of what came in. Properties of faces go where there are none.
    GeometryFile finish(std::string format) &&;

    static constexpr std::uint64_t kMostElements = Tessara::Geometry::kDeletedElement;

private:
    struct Property {
        std::string name;
        char const* component;
        Orvan::MutablePtr<Tessara::Object> object;
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
    std::uint64_t pointCount_ = 0; // expected or there
    RawGeometry raw_;
    Orvan::Array<Tessara::Math::double3> widePositions_; // if positions are moved: as in the file
    double largestLoss_ = 0; // of coordinates that lose digits
    bool hasUnusableElements_ = false;
    std::vector<Property> properties_;
    std::vector<std::string> notes_;
};

}
