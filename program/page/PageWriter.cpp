#include "PageWriter.h"

#include "DrawnGeometry.h"
#include "Viewer.h"
#include "files/GeometryBuilder.h"
#include "files/OutputBlocks.h"
#include "files/Streams.h"
#include "geometry/Facts.h"
#include "geometry/Histograms.h"
#include "shell/Failure.h"

#include <fmt/format.h>

#include <map>

namespace ModelingProgram {

using namespace Tessara::Geometry;

namespace {

    // What software rendering on two cores turns smoothly enough, and what fits a tab of a browser.
    constexpr std::uint64_t kMostPerView = 2'000'000;
    constexpr std::uint64_t kMostPerPage = 4'000'000;
    constexpr std::size_t kMostTexts = 256; // distinct ones of an attribute

    constexpr std::size_t kGroupBytes = 48; // become 64 characters

    void appendBase64(unsigned char const* data, std::size_t bytes, OutputBuffer& text)
    {
        static constexpr char kDigits[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
        char* out = text.extend((bytes + 2) / 3 * 4);
        std::size_t i = 0;
        for (; i + 2 < bytes; i += 3, out += 4) {
            unsigned int const bits = static_cast<unsigned int>(data[i] << 16 | data[i + 1] << 8 | data[i + 2]);
            out[0] = kDigits[bits >> 18];
            out[1] = kDigits[bits >> 12 & 63];
            out[2] = kDigits[bits >> 6 & 63];
            out[3] = kDigits[bits & 63];
        }
        if (i == bytes)
            return;
        unsigned int const bits = static_cast<unsigned int>(data[i] << 16)
            | (i + 1 < bytes ? static_cast<unsigned int>(data[i + 1] << 8) : 0);
        out[0] = kDigits[bits >> 18];
        out[1] = kDigits[bits >> 12 & 63];
        out[2] = i + 1 < bytes ? kDigits[bits >> 6 & 63] : '=';
        out[3] = '=';
    }

    void writeBase64(void const* data, std::uint64_t bytes, OutputFile& out)
    {
        auto const* const first = static_cast<unsigned char const*>(data);
        std::uint64_t const groups = (bytes + kGroupBytes - 1) / kGroupBytes;
        writeInBlocks(
            groups, kGroupBytes / 3 * 4,
            [=](std::uint64_t begin, std::uint64_t end, OutputBuffer& text) {
                std::uint64_t const last = std::min(bytes, end * kGroupBytes);
                appendBase64(first + begin * kGroupBytes, last - begin * kGroupBytes, text);
            },
            out);
    }

    /// JSON that is harmless in HTML: ASCII only, and no "<" that could end the element.
    std::string jsonInHtml(Json const& document)
    {
        std::string const json = document.dump(-1, ' ', true, Json::error_handler_t::replace);
        std::string text;
        text.reserve(json.size());
        for (char const c : json)
            c == '<' ? text += "\\u003c" : text += c;
        return text;
    }

    void write(std::span<std::string_view const> parts, OutputFile& out)
    {
        for (std::string_view const part : parts)
            out << part;
    }

    template <class Scalar> char const* scalarName()
    {
        if constexpr (std::is_same_v<Scalar, float>)
            return "Float32";
        else if constexpr (std::is_same_v<Scalar, double>)
            return "Float64";
        else if constexpr (sizeof(Scalar) == 8)
            return std::is_signed_v<Scalar> ? "BigInt64" : "BigUint64";
        else if constexpr (sizeof(Scalar) == 4)
            return std::is_signed_v<Scalar> ? "Int32" : "Uint32";
        else if constexpr (sizeof(Scalar) == 2)
            return std::is_signed_v<Scalar> ? "Int16" : "Uint16";
        else
            return std::is_same_v<Scalar, signed char> ? "Int8" : "Uint8"; // bool too
    }

    /// The numbers of the elements of a component that are drawn.
    std::optional<Indices> const& drawnOf(std::string const& elements, DrawnGeometry const& drawn)
    {
        return elements == "points" ? drawn.points : elements == "corners" ? drawn.corners : drawn.cells;
    }

    /// Texts as numbers of distinct ones, in order of appearance.
    struct NumberedTexts {
        Json texts = Json::array();
        Orvan::Array<unsigned short> numbers;
        bool areTooMany = false;
    };

    /// \param textAt  the text of an element
    template <class TextAt> NumberedTexts numberTexts(std::uint64_t count, TextAt const& textAt)
    {
        NumberedTexts result;
        result.numbers = Orvan::Array<unsigned short>(count, Orvan::kUninitialized);
        std::map<std::string_view, unsigned short> known;
        for (std::uint64_t i = 0; i != count; ++i) {
            auto const [text, isNew] = known.emplace(textAt(i), static_cast<unsigned short>(known.size()));
            if (isNew && known.size() > kMostTexts) {
                result.areTooMany = true;
                return result;
            }
            if (isNew)
                result.texts.push_back(std::string(text->first));
            result.numbers[i] = text->second;
        }
        return result;
    }

    Json describeHistograms(Histograms const& found)
    {
        // Pairs of an exponent and a count: most bins are empty.
        Json lengths = Json::array();
        for (std::size_t bin = 0; bin != found.edgeLengths.size(); ++bin)
            if (found.edgeLengths[bin] != 0)
                lengths.push_back(
                    {static_cast<std::int64_t>(bin) + Histograms::kLowestExponent * Histograms::kBinsPerOctave,
                        found.edgeLengths[bin]});
        return {{"edgeLengths", lengths}, {"binsPerOctave", Histograms::kBinsPerOctave}, {"zeroEdges", found.zeroEdges},
            {"qualities", found.qualities}};
    }

    char const* nameOfKind(WritableGeometry::Kind kind)
    {
        return kind == WritableGeometry::Kind::Mesh   ? "mesh"
            : kind == WritableGeometry::Kind::Strands ? "strands"
                                                      : "points";
    }

}

void PageWriter::checkWritable(std::filesystem::path const& file, Existing existing)
{
    std::string const extension = file.extension().string();
    std::error_code ignored;
    auto const refuse = [&](char const* why) {
        throw Failure(ExitCode::File, fmt::format("{} cannot be written: {}", file.string(), why));
    };
    if (extension != ".html" && extension != ".htm")
        refuse("the name of a page has to end in .html");
    if (existing == Existing::Keep && !isStream(file) && std::filesystem::is_regular_file(file, ignored))
        refuse("the file exists; --force replaces it");
    OutputFile::checkWritable(file, existing);
}

PageWriter::PageWriter(std::filesystem::path const& file, Existing existing, std::size_t viewCount)
    : out_(file, existing)
    , mostElements_(std::min(kMostPerView, kMostPerPage / std::max<std::size_t>(1, viewCount)))
{
    out_ << "<!DOCTYPE html>\n<html lang=\"en\">\n<head>\n<meta charset=\"utf-8\">\n"
            "<meta http-equiv=\"Content-Security-Policy\" content=\"default-src 'none'; script-src 'sha256-"
         << viewer().scriptHash << "'; style-src 'sha256-" << viewer().styleHash
         << "'; base-uri 'none'; form-action 'none'\">\n"
            "<meta name=\"viewport\" content=\"width=device-width, initial-scale=1\">\n"
            "<title>modeling</title>\n<style>";
    write(viewer().style, out_);
    out_ << "</style>\n</head>\n<body>\n<main id=\"page\"><p>Loading. This page needs JavaScript.</p></main>\n";
}

void PageWriter::add(
    Tessara::Object const& object, std::string const& name, std::string const& role, MeshTopology const* topology)
{
    Json view = {{"name", name}, {"role", role}, {"facts", {{"counts", countsOf(object)}}}};
    bool const isMesh = typeOf(object) == GeometryType::Mesh;
    std::optional<MeshTopology> found;
    if (isMesh) {
        MeshArrays const mesh = arraysOf(object);
        if (!topology)
            topology = &found.emplace(analyzeTopology(mesh));
        view["facts"]["topology"] = describeTopology(mesh, *topology);
        view["histograms"] = describeHistograms(measureHistograms(mesh));
    }
    view["facts"]["boundingBox"] = describeBox(boundingBoxOf(object));
    view["facts"]["properties"] = describeProperties(propertiesOf(object));
    bool const findsEdges = isMesh && (topology->boundaryEdges || topology->nonManifoldEdges);
    DrawnGeometry drawn = chooseDrawn(object, mostElements_, findsEdges);
    view["kind"] = nameOfKind(drawn.all.kind);
    view["arrays"] = addArrays(drawn);
    view["attributes"] = Json::array();
    for (Attribute const& attribute : drawn.all.attributes)
        if (Json described = addAttribute(attribute, drawn); !described.is_null())
            view["attributes"].push_back(std::move(described));
    for (FaceNames const& names : drawn.all.faceNames) {
        std::optional<Indices> const& cells = drawn.cells;
        NumberedTexts const numbered = numberTexts(cells ? cells->size : names.numbers->size,
            [&](std::uint64_t i) { return names.textAt((*names.numbers)[cells ? (*cells)[i] : i]); });
        if (!numbered.areTooMany)
            view["attributes"].push_back({{"name", names.name}, {"of", "faces"}, {"type", "string"},
                {"array", addArray(numbered.numbers)}, {"texts", numbered.texts}});
    }
    view["notes"] = drawn.notes;
    for (std::string const& sentence : drawn.all.leftOut)
        view["notes"].push_back(sentence + ".");
    views_.push_back(std::move(view));
}

Json PageWriter::addArrays(DrawnGeometry const& drawn)
{
    WritableGeometry const& all = drawn.all;
    Json arrays;
    arrays["positions"] = addChosen(*all.positions, drawn.points);
    if (all.kind == WritableGeometry::Kind::Strands)
        arrays["offsets"] = addArray(drawn.offsets ? *drawn.offsets : *all.offsets);
    if (all.kind != WritableGeometry::Kind::Mesh)
        return arrays;
    arrays["cornerPoints"] = addArray(drawn.cornerPoints ? *drawn.cornerPoints : *all.faceVertex);
    if (drawn.triangles) {
        arrays["triangles"] = addArray(*drawn.triangles);
        arrays["offsets"] = addArray(*all.offsets);
    }
    arrays["boundaryEdges"] = addArray(drawn.boundaryEdges);
    arrays["nonManifoldEdges"] = addArray(drawn.nonManifoldEdges);
    return arrays;
}

Json PageWriter::addAttribute(Attribute const& attribute, DrawnGeometry const& drawn)
{
    std::string const elements = elementNames(attribute.component);
    std::optional<Indices> const& chosen = drawnOf(elements, drawn);
    Json result;
    visitArray(attribute.values, [&](auto const& values, auto elementType) {
        using T = typename decltype(elementType)::Type;
        result = {{"name", attribute.name}, {"of", elements}, {"type", elementType.name}};
        if constexpr (std::is_same_v<T, Orvan::String>) {
            NumberedTexts const numbered = numberTexts(chosen ? chosen->size : values.size,
                [&](std::uint64_t i) { return values[chosen ? (*chosen)[i] : i].view(); });
            if (numbered.areTooMany) {
                result = {};
                return;
            }
            result["array"] = addArray(numbered.numbers);
            result["texts"] = numbered.texts;
        } else if constexpr (ElementLayout<T>::components != 0)
            result["array"] = addChosen(values, chosen);
        else
            result = {};
    });
    return result;
}

template <class T> Json PageWriter::addArray(Orvan::Array<T> const& array)
{
    using Layout = ElementLayout<T>;
    return addBlock(scalarName<typename Layout::Scalar>(), Layout::components, array.data, array.size * sizeof(T));
}

template <class T> Json PageWriter::addChosen(Orvan::Array<T> const& array, std::optional<Indices> const& elements)
{
    return elements ? addArray(gathered(array, *elements)) : addArray(array);
}

Json PageWriter::addBlock(char const* type, unsigned int components, void const* data, std::uint64_t bytes)
{
    std::string const name = fmt::format("block{}", blockCount_++);
    out_ << "<script type=\"text/plain\" id=\"" << name << "\">";
    writeBase64(data, bytes, out_);
    out_ << "</script>\n";
    return {{"block", name}, {"type", type}, {"components", components}, {"bytes", bytes}};
}

void PageWriter::finish(std::string const& title, Json const& run)
{
    out_ << "<script type=\"application/json\" id=\"data\">"
         << jsonInHtml({{"title", title}, {"version", MODELING_VERSION}, {"run", run}, {"views", views_}})
         << "</script>\n<script>";
    write(viewer().script, out_);
    out_ << "</script>\n</body>\n</html>\n";
    out_.commit();
}

}
