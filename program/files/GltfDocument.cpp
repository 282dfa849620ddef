#include "GltfDocument.h"

#include "GeometryBuilder.h"

#include <algorithm>
#include <bit>

namespace ModelingProgram {

namespace {

    using Json = GltfDocument::Json;

    static_assert(std::endian::native == std::endian::little, "numbers are read with the byte order of memory");

    constexpr std::uint32_t kMagic = 0x46546C67; // "glTF"
    constexpr std::uint32_t kJsonChunk = 0x4E4F534A; // "JSON"
    constexpr std::uint32_t kBinaryChunk = 0x004E4942; // "BIN"

    template <class T> T loaded(std::byte const* bytes)
    {
        T value;
        std::memcpy(&value, bytes, sizeof(T));
        return value;
    }

    std::size_t bytesOf(GltfScalar scalar)
    {
        return visitGltfScalar(scalar, [](auto number) { return sizeof(number); });
    }

    /// The value of a digit, or -1.
    int digitOf(char c, int base)
    {
        constexpr std::string_view kBase64 = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789+/";
        constexpr std::string_view kHex = "0123456789abcdef";
        std::size_t const digit = base == 64 ? kBase64.find(c) : kHex.find(lowerCase(c));
        return digit == std::string_view::npos ? -1 : static_cast<int>(digit);
    }

    /// Nullopt if the text is not Base64.
    std::optional<std::vector<std::byte>> decodeBase64(std::string_view text)
    {
        while (text.ends_with('='))
            text.remove_suffix(1);
        std::vector<std::byte> result;
        result.reserve(text.size() / 4 * 3 + 2);
        std::uint32_t bits = 0;
        int bitCount = 0;
        for (char const c : text) {
            int const digit = digitOf(c, 64);
            if (digit < 0)
                return std::nullopt;
            bits = bits << 6 | static_cast<std::uint32_t>(digit);
            bitCount += 6;
            if (bitCount >= 8)
                result.push_back(static_cast<std::byte>(bits >> (bitCount -= 8)));
        }
        return result;
    }

    /// Replaces %20 and the like.
    std::string decodePercents(std::string_view uri)
    {
        std::string result;
        for (std::size_t i = 0; i < uri.size(); ++i) {
            int const high = uri[i] == '%' && i + 2 < uri.size() ? digitOf(uri[i + 1], 16) : -1;
            int const low = high >= 0 ? digitOf(uri[i + 2], 16) : -1;
            result += low >= 0 ? static_cast<char>(high * 16 + low) : uri[i];
            i += low >= 0 ? 2 : 0;
        }
        return result;
    }

    /// Extensions without influence on positions, faces and attributes.
    bool isHarmless(std::string_view extension)
    {
        constexpr std::string_view kPrefixes[] = {
            "KHR_materials_", "KHR_texture_", "EXT_texture_", "KHR_lights_", "KHR_mesh_quantization", "KHR_xmp"};
        return std::any_of(std::begin(kPrefixes), std::end(kPrefixes),
            [=](std::string_view prefix) { return extension.starts_with(prefix); });
    }

}

std::size_t GltfArray::elementBytes() const
{
    return components * bytesOf(scalar);
}

std::uint64_t GltfArray::replacedElement(std::uint64_t i) const
{
    switch (replacedScalar) {
    case GltfScalar::UnsignedByte:
        return loaded<std::uint8_t>(replaced + i);
    case GltfScalar::UnsignedShort:
        return loaded<std::uint16_t>(replaced + i * sizeof(std::uint16_t));
    default:
        return loaded<std::uint32_t>(replaced + i * sizeof(std::uint32_t));
    }
}

GltfDocument::GltfDocument(InputFile const& file)
    : Scanner(file, 0)
    , place_("header")
{
    isBinary_ = remaining() >= sizeof(kMagic) && std::memcmp(at_, &kMagic, sizeof(kMagic)) == 0;
    if (!isBinary_ && lowerCase(file.path.extension().string()) == ".glb")
        refuse("it does not begin with \"glTF\", as GLB files do");
    parse(isBinary_ ? splitIntoChunks() : std::string_view(at_, remaining()));
    checkVersionAndExtensions();
    buffers_.resize(list("buffers").size());
}

/// \return the JSON
std::string_view GltfDocument::splitIntoChunks()
{
    constexpr std::size_t kHeaderBytes = 12, kChunkHeaderBytes = 8;
    auto const* const bytes = reinterpret_cast<std::byte const*>(at_);
    if (remaining() < kHeaderBytes + kChunkHeaderBytes)
        refuse("the file is cut off");
    if (std::uint32_t const version = loaded<std::uint32_t>(bytes + 4); version != 2)
        refuse("it has version " + std::to_string(version) + " of the format; version 2 is read");
    std::uint64_t const length = loaded<std::uint32_t>(bytes + 8);
    if (length > remaining())
        refuse("the file is cut off: it declares " + std::to_string(length) + " bytes, but has "
            + std::to_string(remaining()));
    bytesLeft_ = remaining() - length;

    std::optional<std::string_view> json;
    for (std::uint64_t start = kHeaderBytes; start < length;) {
        place_ = "chunk at byte " + std::to_string(start);
        if (length - start < kChunkHeaderBytes)
            refuse("it is cut off");
        std::uint64_t const size = loaded<std::uint32_t>(bytes + start);
        auto const type = loaded<std::uint32_t>(bytes + start + 4);
        start += kChunkHeaderBytes;
        if (size > length - start)
            refuse("it declares " + std::to_string(size) + " bytes, but " + std::to_string(length - start)
                + " are left in the file");
        if (!json && type != kJsonChunk)
            refuse("the first chunk is not JSON");
        if (!json)
            json = std::string_view(at_ + start, size);
        else if (type == kBinaryChunk && !chunk_.data)
            chunk_ = {bytes + start, size};
        start += size; // chunks of other types are skipped, as the format demands
    }
    if (!json)
        refuse("it has no chunk of JSON");
    return *json;
}

void GltfDocument::parse(std::string_view json)
{
    place_ = "JSON";
    try {
        root_ = Json::parse(json);
    } catch (Json::parse_error const& error) { // whose text repeats what was read last, which may be long
        refuse("it is malformed at byte " + std::to_string(error.byte));
    } catch (Json::exception const& error) {
        refuse(std::string("it is malformed: ") + error.what());
    }
    if (!root_.is_object())
        refuse("it is not an object");
}

void GltfDocument::checkVersionAndExtensions() const
{
    auto const asset = root_.find("asset");
    std::string const version = asset != root_.end() && asset->is_object() ? text(*asset, "version") : "";
    if (!version.starts_with("2."))
        refuse("asset.version is " + TextScanner::quoted(version) + "; version 2 is read");
    for (Json const& extension : list("extensionsRequired")) {
        std::string const name = extension.is_string() ? extension.get<std::string>() : std::string();
        if (name == "KHR_draco_mesh_compression" || name == "EXT_meshopt_compression"
            || name == "KHR_meshopt_compression")
            refuse("the geometry is compressed (" + name
                + "), which is not supported; export the file without compression");
        if (!isHarmless(name))
            refuse("the file requires the extension " + TextScanner::quoted(name) + ", which is not supported");
    }
}

Json const& GltfDocument::listIn(Json const& parent, char const* name) const
{
    static Json const kEmpty = Json::array();
    auto const found = parent.find(name);
    if (found == parent.end())
        return kEmpty;
    if (!found->is_array())
        refuse(std::string(name) + " is not an array");
    return *found;
}

Json const& GltfDocument::item(char const* name, std::uint64_t index) const
{
    Json const& items = list(name);
    if (index >= items.size())
        refuse("it refers to " + std::string(name) + " " + std::to_string(index) + ", but the file has "
            + std::to_string(items.size()) + ", counted from 0");
    if (!items[index].is_object())
        refuse("entry " + std::to_string(index) + " of " + name + " is not an object");
    return items[index];
}

std::optional<std::uint64_t> GltfDocument::findNumber(Json const& parent, char const* name) const
{
    auto const found = parent.find(name);
    if (found == parent.end())
        return std::nullopt;
    if (!found->is_number_unsigned())
        refuse(std::string(name) + " is not a whole number of at least 0");
    return found->get<std::uint64_t>();
}

std::uint64_t GltfDocument::number(Json const& parent, char const* name) const
{
    auto const found = findNumber(parent, name);
    if (!found)
        refuse(std::string(name) + " is missing");
    return *found;
}

std::string GltfDocument::text(Json const& parent, char const* name) const
{
    auto const found = parent.find(name);
    return found != parent.end() && found->is_string() ? found->get<std::string>() : std::string();
}

GltfDocument::Bytes GltfDocument::buffer(std::uint64_t index)
{
    Json const& json = item("buffers", index);
    std::optional<Bytes>& known = buffers_[index];
    if (!known) {
        Bytes bytes = loadBuffer(json, index);
        std::uint64_t const size = number(json, "byteLength");
        if (size > bytes.size)
            refuse("buffer " + std::to_string(index) + " declares " + std::to_string(size) + " bytes, but has "
                + std::to_string(bytes.size));
        bytes.size = size;
        known = bytes;
    }
    return *known;
}

GltfDocument::Bytes GltfDocument::loadBuffer(Json const& json, std::uint64_t index)
{
    if (!json.contains("uri")) {
        if (index != 0 || !chunk_.data)
            refuse("buffer " + std::to_string(index) + " has no data in this file");
        return chunk_;
    }
    std::string const uri = text(json, "uri");
    if (!uri.starts_with("data:")) {
        std::filesystem::path const path = fileBeside(uri);
        auto file = std::find_if(files_.begin(), files_.end(), [&](auto const& known) { return known->path == path; });
        try {
            if (file == files_.end())
                file = files_.insert(file, std::make_unique<InputFile>(path));
        } catch (FileError const& error) {
            refuse("buffer " + std::to_string(index) + ": " + error.what());
        }
        return {reinterpret_cast<std::byte const*>((*file)->bytes.get()), (*file)->size};
    }
    std::size_t const comma = uri.find(',');
    std::optional<std::vector<std::byte>> decoded;
    if (comma != std::string::npos && std::string_view(uri).substr(0, comma).ends_with(";base64"))
        decoded = decodeBase64(std::string_view(uri).substr(comma + 1));
    if (!decoded)
        refuse("the data of buffer " + std::to_string(index) + " is not Base64");
    decoded_.push_back(std::move(*decoded));
    return {decoded_.back().data(), decoded_.back().size()};
}

/// A file from an unknown source must not read files elsewhere.
std::filesystem::path GltfDocument::fileBeside(std::string const& uri) const
{
    std::filesystem::path const path = std::filesystem::path(decodePercents(uri)).lexically_normal();
    bool const isBeside = !uri.empty() && uri.find(':') == std::string::npos && path.is_relative() && !path.empty()
        && *path.begin() != ".." && path.native().find('\0') == std::string::npos;
    if (!isBeside)
        refuse(TextScanner::quoted(uri) + " is not read: binary data has to be in the same folder or below it");
    return file_.path.parent_path() / path;
}

/// The bytes of a buffer view from an offset on.
/// \param stride  Receives the distance of its elements, if the view declares one.
GltfDocument::Bytes GltfDocument::view(std::uint64_t index, std::uint64_t offset, std::uint64_t* stride)
{
    Json const& json = item("bufferViews", index);
    std::string const name = "buffer view " + std::to_string(index);
    if (json.contains("extensions") && json["extensions"].is_object()
        && (json["extensions"].contains("EXT_meshopt_compression")
            || json["extensions"].contains("KHR_meshopt_compression")))
        refuse(name + " is compressed, which is not supported; export the file without compression");
    Bytes const whole = buffer(number(json, "buffer"));
    std::uint64_t const start = findNumber(json, "byteOffset").value_or(0);
    std::uint64_t const size = number(json, "byteLength");
    if (start > whole.size || size > whole.size - start)
        refuse(name + " ends after its buffer");
    if (offset > size)
        refuse("it begins after the end of " + name);
    if (auto const declared = findNumber(json, "byteStride")) {
        constexpr std::uint64_t kMostStride = 252;
        if (*declared == 0 || *declared > kMostStride)
            refuse("byteStride of " + name + " is not from 1 to 252");
        *stride = *declared;
    }
    return {whole.data + start + offset, size - offset};
}

GltfScalar GltfDocument::scalarOf(Json const& parent) const
{
    std::uint64_t const type = number(parent, "componentType");
    if (type < 5120 || type > 5126 || type == 5124)
        refuse("componentType " + std::to_string(type) + " does not exist");
    return static_cast<GltfScalar>(type);
}

GltfArray GltfDocument::array(std::uint64_t accessor)
{
    struct Type {
        std::string_view name;
        unsigned int components;
        bool isMatrix;
    };
    constexpr Type kTypes[] = {{"SCALAR", 1, false}, {"VEC2", 2, false}, {"VEC3", 3, false}, {"VEC4", 4, false},
        {"MAT2", 4, true}, {"MAT3", 9, true}, {"MAT4", 16, true}};
    Json const& json = item("accessors", accessor);
    std::string const name = text(json, "type");
    auto const* const type =
        std::find_if(std::begin(kTypes), std::end(kTypes), [&](Type const& known) { return known.name == name; });
    if (type == std::end(kTypes))
        refuse("type " + TextScanner::quoted(name) + " of accessor " + std::to_string(accessor) + " does not exist");

    // Without data all elements are 0 before some are replaced, so that a few bytes could demand any amount of memory.
    constexpr std::uint64_t kMostWithoutData = 1 << 24;
    GltfArray array;
    array.count = number(json, "count");
    array.scalar = scalarOf(json);
    array.components = type->components;
    array.isMatrix = type->isMatrix;
    auto const normalized = json.find("normalized");
    array.isNormalized = normalized != json.end() && normalized->is_boolean() && normalized->get<bool>();
    // Columns of other matrices are padded.
    if (array.isMatrix && array.scalar != GltfScalar::Float)
        refuse("accessor " + std::to_string(accessor) + " has matrices of integers, which are not supported");
    if (array.count >= GeometryBuilder::kMostElements)
        refuse("accessor " + std::to_string(accessor) + " has more elements than a mesh can hold");
    array.stride = array.elementBytes();
    if (auto const viewIndex = findNumber(json, "bufferView")) {
        Bytes const bytes = view(*viewIndex, findNumber(json, "byteOffset").value_or(0), &array.stride);
        // Fits 64 bits: the count has 32 bits, and the stride 8.
        if (array.stride < array.elementBytes()
            || (array.count != 0 && (array.count - 1) * array.stride + array.elementBytes() > bytes.size))
            refuse("accessor " + std::to_string(accessor) + " ends after its buffer view");
        array.data = bytes.data;
    } else if (array.count > std::max<std::uint64_t>(file_.size, kMostWithoutData)) {
        refuse("accessor " + std::to_string(accessor) + " has " + std::to_string(array.count)
            + " elements without data, more than " + std::to_string(kMostWithoutData) + " and than the file has bytes");
    }
    if (auto const sparse = json.find("sparse"); sparse != json.end())
        readReplacements(*sparse, array);
    return array;
}

void GltfDocument::readReplacements(Json const& sparse, GltfArray& array)
{
    if (!sparse.is_object() || !sparse.contains("indices") || !sparse["indices"].is_object()
        || !sparse.contains("values") || !sparse["values"].is_object())
        refuse("sparse is incomplete");
    array.replacedCount = number(sparse, "count");
    array.replacedScalar = scalarOf(sparse["indices"]);
    if (array.replacedScalar != GltfScalar::UnsignedByte && array.replacedScalar != GltfScalar::UnsignedShort
        && array.replacedScalar != GltfScalar::UnsignedInt)
        refuse("the indices of sparse are not unsigned integers");
    if (array.replacedCount > array.count)
        refuse("sparse has more elements than its accessor");
    auto const bytesOfPart = [&](char const* name, std::size_t elementBytes) {
        std::uint64_t ignoredStride = 0;
        Bytes const bytes = view(
            number(sparse[name], "bufferView"), findNumber(sparse[name], "byteOffset").value_or(0), &ignoredStride);
        if (array.replacedCount * elementBytes > bytes.size)
            refuse(std::string("the ") + name + " of sparse end after their buffer view");
        return bytes.data;
    };
    array.replaced = bytesOfPart("indices", bytesOf(array.replacedScalar));
    array.replacements = bytesOfPart("values", array.elementBytes());
    for (std::uint64_t i = 0; i < array.replacedCount; ++i) {
        if (array.replacedElement(i) >= array.count
            || (i != 0 && array.replacedElement(i) <= array.replacedElement(i - 1)))
            refuse("the indices of sparse do not ascend within the accessor");
    }
}

}
