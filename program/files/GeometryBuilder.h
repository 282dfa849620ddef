#pragma once

#include "ElementLayout.h"
#include "Scanner.h"

#include <TessaraGeometry/Makers.h>

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

/// Where the values of a new property lie, to be filled in.
struct PropertyValues {
    std::byte* data;
    std::size_t elementBytes;
};

/// Takes in what a reader finds, and checks it on the way: the one place that decides which geometry is accepted.
class GeometryBuilder {
public:
    /// Refusals are said through the scanner, which therefore stands at what is handed in.
    explicit GeometryBuilder(Scanner const& scanner)
        : scanner_(scanner)
    {
    }

    /// For counts that are known, and that the file can hold: corners may then name points that come later.
    void expectPoints(std::uint64_t count);
    void expectFaces(std::uint64_t count) { faceOffset_.reserve(count + 1); }

    void addPoint(Tessara::Math::float3 const& position)
    {
        if (!std::isfinite(position.x) || !std::isfinite(position.y) || !std::isfinite(position.z))
            scanner_.refuse("a coordinate is not finite");
        positions_.append(position);
        pointCount_ = std::max(pointCount_, positions_.size);
    }

    template <class Index> void addCorner(Index point)
    {
        if (std::cmp_less(point, 0) || std::cmp_greater_equal(point, pointCount_))
            refuseIndex("face", std::to_string(point));
        faceVertex_.append(static_cast<unsigned int>(point));
    }

    void endFace()
    {
        if (faceVertex_.size - faceOffset_[faceOffset_.size - 1] < 3)
            scanner_.refuse("a face has fewer than three corners");
        if (faceVertex_.size >= kMostElements)
            scanner_.refuse("there are more face corners than a mesh can hold");
        faceOffset_.append(static_cast<unsigned int>(faceVertex_.size));
    }

    /// Makes these points, in this order, a strand set; the offsets say where its strands begin and the last one ends.
    /// Properties of the points are handed in for the points as they are then.
    void makeStrands(Orvan::Array<unsigned int> offsets, Orvan::Array<unsigned int> const& points);

    std::uint64_t pointCount() const { return positions_.size; }
    std::uint64_t cornerCount() const { return faceVertex_.size; }
    std::uint64_t faceCount() const { return faceOffset_.size - 1; }
    Orvan::Array<unsigned int> const& faceOffset() const { return faceOffset_; }

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

    [[noreturn]] void refuseIndex(char const* element, std::string const& index) const;

    Scanner const& scanner_;
    std::uint64_t pointCount_ = 0; // expected or there
    Orvan::Array<Tessara::Math::float3> positions_;
    Orvan::Array<unsigned int> faceVertex_;
    Orvan::Array<unsigned int> faceOffset_{0u};
    Orvan::Array<unsigned int> strandOffset_;
    std::vector<Property> properties_;
    std::vector<std::string> notes_;
};

}
