#include "GeometryBuilder.h"

#include "JoinedArrays.h"

#include <TessaraGeometry/Names.h>

#include <cstdio>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Tessara::Math::double3;
using Tessara::Math::float3;

namespace {

    struct Box {
        double3 min{HUGE_VAL, HUGE_VAL, HUGE_VAL};
        double3 max{-HUGE_VAL, -HUGE_VAL, -HUGE_VAL};

        double longestSide() const { return std::max({max.x - min.x, max.y - min.y, max.z - min.z}); }
    };

    /// The box of the positions that are finite in single precision, as in `floats`.
    template <class T> Box boxOf(Orvan::Array<float3> const& floats, Orvan::Array<T> const& positions)
    {
        Box box;
        for (std::uint64_t point = 0; point < positions.size; ++point) {
            T const& p = positions[point];
            if (!isFinite(floats[point]))
                continue;
            box.min = {
                std::min<double>(box.min.x, p.x), std::min<double>(box.min.y, p.y), std::min<double>(box.min.z, p.z)};
            box.max = {
                std::max<double>(box.max.x, p.x), std::max<double>(box.max.y, p.y), std::max<double>(box.max.z, p.z)};
        }
        return box;
    }

    /// "4,100,235", "0.25", "3e-08".
    std::string shortNumber(double number)
    {
        char text[32];
        std::snprintf(text, sizeof(text), number >= 1000 && number < 1e15 ? "%.0f" : "%.2g", number);
        std::string result = text;
        if (number >= 1000 && number < 1e15)
            for (std::size_t end = result.size(); end > 3; end -= 3)
                result.insert(end - 3, 1, ',');
        return result;
    }

}

double3 roundedCenterOf(Orvan::Array<float3> const& floats, Orvan::Array<double3> const& positions)
{
    Box const box = boxOf(floats, positions);
    double const side = box.longestSide();
    if (!(side >= 0))
        return {0, 0, 0}; // no point is finite
    int const digits = side > 0 ? static_cast<int>(std::ceil(std::log10(side))) : 0;
    double const power = std::pow(10.0, std::abs(digits));
    auto const rounded = [&](double least, double most) {
        double const middle = least + (most - least) / 2;
        double const multiple = digits < 0 ? std::round(middle * power) / power : std::round(middle / power) * power;
        return multiple + 0.0; // -0 becomes 0
    };
    return {rounded(box.min.x, box.max.x), rounded(box.min.y, box.max.y), rounded(box.min.z, box.max.z)};
}

std::string_view namePrefix(Orvan::String const& component)
{
    if (component == sPointComp)
        return "point:";
    if (component == sFaceComp)
        return "face:";
    if (component == sFaceVertexComp)
        return "corner:";
    return component == sStrandComp ? "strand:" : "";
}

std::string elementNames(Orvan::String const& component)
{
    std::string_view const prefix = namePrefix(component);
    return prefix.empty() ? std::string(component.view()) : std::string(prefix.substr(0, prefix.size() - 1)) + "s";
}

bool isReservedName(std::string_view name)
{
    constexpr std::string_view kReserved[] = {sPointComp, sFaceComp, sFaceVertexComp, sStrandComp, sPointPosition,
        sFaceVertex, sFaceOffset, sStrandOffset, Tessara::Object::kExcludedKeys};
    return std::find(std::begin(kReserved), std::end(kReserved), name) != std::end(kReserved);
}

void GeometryBuilder::expectOtherPoints(std::uint64_t count)
{
    if (count >= kMostElements)
        scanner_.refuse("there are more points than a mesh can hold");
    pointCount_ = count;
}

void GeometryBuilder::expectPoints(std::uint64_t count)
{
    expectOtherPoints(count);
    raw_.positions.reserve(count);
    if (movesPositions())
        widePositions_.reserve(count);
}

void GeometryBuilder::setPoints(Orvan::Array<float3> positions, Orvan::Array<double3> widePositions, double largestLoss)
{
    pointCount_ = positions.size;
    raw_.positions = std::move(positions);
    widePositions_ = std::move(widePositions);
    largestLoss_ = largestLoss;
}

void GeometryBuilder::setFaces(Orvan::Array<unsigned int> faceVertex, Orvan::Array<unsigned int> faceOffset)
{
    raw_.faceVertex = std::move(faceVertex);
    raw_.faceOffset = std::move(faceOffset);
}

void GeometryBuilder::join(std::vector<GeometryBuilder*> const& parts)
{
    std::uint64_t cornerCount = 0;
    for (GeometryBuilder const* const part : parts) {
        cornerCount += part->cornerCount();
        largestLoss_ = std::max(largestLoss_, part->largestLoss_);
        hasUnusableElements_ = hasUnusableElements_ || part->hasUnusableElements_;
    }
    if (cornerCount >= kMostElements)
        scanner_.refuse("there are more face corners than a mesh can hold");
    auto const join = [&](auto RawGeometry::*array) {
        return joinedArray(
            parts, [=](GeometryBuilder & part) -> auto& { return part.raw_.*array; });
    };
    raw_.positions = join(&RawGeometry::positions);
    raw_.faceVertex = join(&RawGeometry::faceVertex);
    raw_.faceOffset =
        joinedOffsets(parts, [](GeometryBuilder& part) -> Orvan::Array<unsigned int>& { return part.raw_.faceOffset; });
    widePositions_ = joinedArray(parts, &GeometryBuilder::widePositions_);
    pointCount_ = std::max(pointCount_, raw_.positions.size);
}

void GeometryBuilder::keepNewPoints(Orvan::Array<unsigned int> const& numbers, unsigned int first, double largestLoss)
{
    auto const keep = [&](auto& values) {
        std::uint64_t keptCount = 0;
        for (std::uint64_t point = 0; point < values.size; ++point)
            if (numbers[point] >= first)
                values[keptCount++] = values[point];
        values.resize(keptCount);
    };
    keep(raw_.positions);
    keep(widePositions_);
    for (unsigned int& corner : raw_.faceVertex)
        corner = numbers[corner];
    largestLoss_ = largestLoss;
}

void GeometryBuilder::makeStrands(Orvan::Array<unsigned int> offsets, Orvan::Array<unsigned int> const& points)
{
    raw_.positions = gathered(raw_.positions, points);
    if (movesPositions())
        widePositions_ = gathered(widePositions_, points);
    raw_.strandOffset = std::move(offsets);
}

void GeometryBuilder::addNotFinitePoint()
{
    if (!options_.isLenient)
        scanner_.refuse("a coordinate is not finite; --lenient leaves such points out");
    hasUnusableElements_ = true;
}

void GeometryBuilder::addShortFace()
{
    if (!options_.isLenient)
        scanner_.refuse("a face has fewer than three corners; --lenient leaves such faces out");
    hasUnusableElements_ = true;
}

void GeometryBuilder::addLoss(double x, double y, double z)
{
    for (double const value : {x, y, z})
        largestLoss_ = std::max(largestLoss_, lossOf(value));
}

void GeometryBuilder::refuseIndex(char const* element, std::string const& index) const
{
    scanner_.refuse(std::string("a ") + element + " refers to point " + index + ", but the file has "
        + std::to_string(pointCount_) + " points, counted from 0");
}

void GeometryBuilder::noteBytesLeft()
{
    if (!scanner_.atEnd())
        note("bytes after the last element are left out: " + std::to_string(scanner_.remaining()));
}

/// Subtracts the origin, if requested, and returns it.
std::optional<double3> GeometryBuilder::movePositions()
{
    if (!movesPositions() || widePositions_.empty())
        return std::nullopt;
    double3 const origin = options_.origin ? *options_.origin : roundedCenterOf(raw_.positions, widePositions_);
    double loss = 0;
    for (std::uint64_t point = 0; point < widePositions_.size; ++point) {
        double3 const& wide = widePositions_[point];
        double3 const moved{wide.x - origin.x, wide.y - origin.y, wide.z - origin.z};
        if (isFinite(raw_.positions[point]))
            loss = std::max({loss, lossOf(moved.x), lossOf(moved.y), lossOf(moved.z)});
        raw_.positions[point] = {static_cast<float>(moved.x), static_cast<float>(moved.y), static_cast<float>(moved.z)};
    }
    // After centering, only the last bits of a float can be lost.
    constexpr double kReportedFraction = 1e-6; // of the longest side
    bool const isReported =
        largestLoss_ != 0 && loss > kReportedFraction * boxOf(raw_.positions, raw_.positions).longestSide();
    largestLoss_ = isReported ? loss : 0;
    return origin;
}

void GeometryBuilder::noteLostDigits()
{
    if (largestLoss_ == 0)
        return;
    Box const box = boxOf(raw_.positions, raw_.positions);
    double largest = 0;
    for (double const bound : {box.min.x, box.min.y, box.min.z, box.max.x, box.max.y, box.max.z})
        largest = std::max(largest, std::abs(bound));
    std::string sentence = "positions lose up to " + shortNumber(largestLoss_)
        + " (single precision at coordinates up to " + shortNumber(largest) + ")";
    if (!movesPositions() && largest > 2 * box.longestSide())
        sentence += "; --center keeps more digits";
    note(std::move(sentence));
}

Orvan::MutablePtr<Tessara::Object> GeometryBuilder::makeObject()
{
    std::optional<UnusableElements> unusable;
    RawGeometry whole;
    if (hasUnusableElements_) {
        unusable.emplace(raw_);
        for (std::string& sentence : unusable->describe())
            note(std::move(sentence));
        if (!unusable->anyPointRemains())
            scanner_.refuseWhole("no point is left");
        whole = raw_;
    }
    bool const isMesh = unusable ? unusable->anyFaceRemains() : faceCount() != 0;
    Orvan::MutablePtr<Tessara::Object> object = isMesh
        ? makeMesh(std::move(raw_.positions), std::move(raw_.faceVertex), std::move(raw_.faceOffset))
        : raw_.strandOffset.empty()
        ? makePointCloud(std::move(raw_.positions))
        : Tessara::Geometry::makeStrands(std::move(raw_.positions), std::move(raw_.strandOffset));
    addProperties(*object);
    if (unusable)
        unusable->deleteFrom(whole, *object);
    return object;
}

void GeometryBuilder::addProperties(Tessara::Object& object)
{
    for (Property& property : properties_) {
        if (!object.hasProperty(property.component))
            continue;
        std::string name = property.name;
        std::replace(name.begin(), name.end(), '\0', '_'); // property names cannot contain null characters
        while (isReservedName(name) || object.hasProperty(Orvan::String(name)))
            name.insert(0, namePrefix(property.component));
        object.setProperty(Orvan::String(name), Orvan::Ptr<Tessara::Object>(std::move(property.object)));
    }
    for (FaceNames& faceNames : faceNames_) {
        if (!object.hasProperty(sFaceComp))
            continue;
        std::string name = faceNames.name;
        while (object.hasProperty(Orvan::String(name)) || object.hasProperty(Orvan::String(name + kNameSuffix)))
            name.insert(0, namePrefix(sFaceComp));
        addRangeProperty(Orvan::String(name), sFaceComp, std::move(faceNames.numbers), object);
        addDataProperty<Orvan::String>(
            Orvan::String(name + kNameSuffix), Orvan::String(name), std::move(faceNames.names), object);
    }
}

GeometryFile GeometryBuilder::finish(std::string format) &&
{
    GeometryFile file;
    file.format = std::move(format);
    file.origin = movePositions();
    noteLostDigits();
    file.object = makeObject();
    file.notes = std::move(notes_);
    return file;
}

}
