#include "Writers.h"

#include <nlohmann/json.hpp>

#include "GeometryBuilder.h"

#include <TessaraGeometry/Elements.h>
#include <TessaraGeometry/Lookup.h>
#include <TessaraGeometry/Prototypes.h>

namespace ModelingProgram {

using namespace Tessara::Geometry;
using Tessara::Math::float3;

namespace {

    [[noreturn]] void refuse(std::filesystem::path const& file, std::string const& why)
    {
        throw FileError(file.string() + " cannot be written: " + why);
    }

    WritableGeometry::Kind kindOf(Tessara::Object const& object)
    {
        if (object.hasProperty(sFaceComp))
            return WritableGeometry::Kind::Mesh;
        return object.hasProperty(sStrandComp) ? WritableGeometry::Kind::Strands : WritableGeometry::Kind::PointCloud;
    }

    void checkValues(WritableGeometry const& geometry, std::filesystem::path const& file)
    {
        auto const isFinite = [](float3 const& p) {
            return std::isfinite(p.x) && std::isfinite(p.y) && std::isfinite(p.z);
        };
        Orvan::Array<float3> const& positions = *geometry.positions;
        float3 const* const bad = std::find_if_not(positions.begin(), positions.end(), isFinite);
        if (bad != positions.end())
            refuse(file, "point " + std::to_string(bad - positions.begin()) + " has a coordinate that is not finite");
        if (geometry.kind != WritableGeometry::Kind::Mesh)
            return;
        Orvan::Array<unsigned int> const& offset = *geometry.offsets;
        for (std::uint64_t face = 0; face + 1 < offset.size; ++face) {
            if (offset[face + 1] - offset[face] < 3)
                refuse(file, "face " + std::to_string(face) + " has fewer than three corners");
        }
    }

    /// The name without the prefix that was added because the name was taken.
    std::string nameInFile(Tessara::Object const& object, Orvan::String const& name, Orvan::String const& component)
    {
        std::string_view const prefix = namePrefix(component);
        if (!name.view().starts_with(prefix))
            return std::string(name.view());
        std::string const plain(name.view().substr(prefix.size()));
        return isReservedName(plain) || object.hasProperty(Orvan::String(plain)) ? plain : std::string(name.view());
    }

    /// \return whether the attribute is the names of a range of faces
    bool addFaceNames(Tessara::Object const& object, Attribute const& attribute, WritableGeometry& geometry)
    {
        auto const* const texts = attribute.values.get<Orvan::Ptr<Orvan::Array<Orvan::String>>>();
        auto numbers = getRangeGeoPropIndices(object, attribute.component);
        bool const isOfFaces = texts && *texts && numbers && geometry.kind == WritableGeometry::Kind::Mesh
            && getGeoPropTargetName(object, attribute.component) == sFaceComp && numbers->size == geometry.cellCount();
        if (isOfFaces)
            geometry.faceNames.push_back(
                {nameInFile(object, attribute.component, sFaceComp), attribute, *texts, std::move(numbers)});
        return isOfFaces;
    }

    void addAttribute(Tessara::Object const& object, Orvan::String const& name, WritableGeometry& geometry)
    {
        Orvan::Ptr<Tessara::Object> const property = getDataGeoProperty(object, name);
        Attribute attribute{
            std::string(name.view()), getGeoPropTargetName(object, name), property->getProperty(sData), {}};
        if (addFaceNames(object, attribute, geometry))
            return;
        bool const isOfElements = !namePrefix(attribute.component).empty() && object.hasProperty(attribute.component);
        if (!isOfElements) {
            leaveOut(attribute, "it belongs to a range or to nothing, not to elements", geometry.leftOut);
            return;
        }
        attribute.name = nameInFile(object, name, attribute.component);
        std::uint64_t const elements = getElementCount(object, attribute.component);
        std::optional<std::uint64_t> length;
        visitArray(attribute.values, [&](auto const& values, auto) { length = values.size; });
        if (length != elements) {
            leaveOut(attribute,
                "it has " + std::to_string(length.value_or(0)) + " values for " + std::to_string(elements)
                    + " elements",
                geometry.leftOut);
            return;
        }
        Tessara::PropertyValue const columnNames = property->getProperty(sColumnNames);
        if (auto const* const names = columnNames.get<Orvan::String>())
            attribute.columnNames = names->view();
        geometry.attributes.push_back(std::move(attribute));
    }

}

std::uint64_t estimateFileBytes(WritableGeometry const& geometry, std::string_view extension)
{
    std::uint64_t const points = geometry.pointCount(), cells = geometry.cellCount();
    std::uint64_t const corners = geometry.faceVertex ? geometry.faceVertex->size : cells != 0 ? points : 0;
    if (extension == ".stl")
        return 50 * cells;
    std::uint64_t values = 0;
    for (Attribute const& attribute : geometry.attributes)
        visitArray(attribute.values, [&](auto const& array, auto) { values += array.size * sizeof(*array.data); });
    if (extension == ".vtp")
        return sizeof(float3) * points + sizeof(std::int64_t) * (corners + cells) + values;
    if (extension != ".obj")
        return sizeof(float3) * points + sizeof(std::int32_t) * corners + cells + values;
    // Measured: about 10 characters per number and its blank.
    std::uint64_t const indexCharacters = std::to_string(points).size() + 1;
    return 32 * points + indexCharacters * corners + 2 * cells + values / sizeof(float) * 10;
}

GeoValidator::Status validateGeometry(Tessara::Object const& object)
{
    switch (kindOf(object)) {
    case WritableGeometry::Kind::Mesh:
        return validateMesh(object);
    case WritableGeometry::Kind::Strands:
        return StrandValidator().validate(object);
    case WritableGeometry::Kind::PointCloud:
        break;
    }
    return PointCloudValidator().validate(object);
}

void leaveOut(Attribute const& attribute, std::string const& why, std::vector<std::string>& sentences)
{
    std::string type;
    visitArray(attribute.values, [&](auto const&, auto elementType) { type = elementType.name; });
    sentences.push_back("\"" + attribute.name + "\" (" + (type.empty() ? "" : type + ", ")
        + elementNames(attribute.component) + ") is left out: " + why);
}

WritableGeometry takeApartUnchecked(Tessara::Object const& object)
{
    WritableGeometry geometry;
    geometry.kind = kindOf(object);
    geometry.positions = dataOf<float3>(object, sPointPosition);
    geometry.faceVertex = dataOf<unsigned int>(object, sFaceVertex);
    if (geometry.kind != WritableGeometry::Kind::PointCloud)
        geometry.offsets =
            dataOf<unsigned int>(object, geometry.kind == WritableGeometry::Kind::Mesh ? sFaceOffset : sStrandOffset);
    auto const names = getGeoPropNamesByPrototype(object, *getDataGeoPropPrototype(sGenericDataGeoProp));
    for (Orvan::String const& name : names) {
        if (!isReservedName(name.view()))
            addAttribute(object, name, geometry);
    }
    return geometry;
}

WritableGeometry takeApart(Tessara::Object const& object, std::filesystem::path const& file)
{
    if (GeoValidator::Status const status = validateGeometry(object); !status)
        refuse(file, "the geometry is invalid: " + std::string(status.message().view()));
    WritableGeometry geometry = takeApartUnchecked(object);
    checkValues(geometry, file);
    return geometry;
}

std::string validUtf8(std::string_view text)
{
    using Json = nlohmann::json;
    // Written and read again, because only writing can replace bytes.
    std::string const json = Json(std::string(text)).dump(-1, ' ', false, Json::error_handler_t::replace);
    return Json::parse(json).get<std::string>();
}

}
