#pragma once

#include "Scanner.h"

#include <nlohmann/json.hpp>

#include <cstddef>
#include <optional>
#include <vector>

namespace ModelingProgram {

/// The type of a number in the binary data; the values are those of the format.
enum class GltfScalar : unsigned int {
    Byte = 5120,
    UnsignedByte = 5121,
    Short = 5122,
    UnsignedShort = 5123,
    UnsignedInt = 5125,
    Float = 5126
};

/// Calls `visit` with a value of the C++ type of the numbers.
template <class Visit> auto visitGltfScalar(GltfScalar scalar, Visit&& visit)
{
    switch (scalar) {
    case GltfScalar::Byte:
        return visit(std::int8_t{});
    case GltfScalar::UnsignedByte:
        return visit(std::uint8_t{});
    case GltfScalar::Short:
        return visit(std::int16_t{});
    case GltfScalar::UnsignedShort:
        return visit(std::uint16_t{});
    case GltfScalar::UnsignedInt:
        return visit(std::uint32_t{});
    case GltfScalar::Float:
        break;
    }
    return visit(float{});
}

/// An array in the binary data, whose bounds have been checked.
struct GltfArray {
    std::uint64_t count = 0;
    GltfScalar scalar = GltfScalar::Float;
    unsigned int components = 1; // per element
    bool isMatrix = false;
    bool isNormalized = false; // integers are fractions of their largest value
    std::byte const* data = nullptr; // null if all elements are zero
    std::uint64_t stride = 0;

    // Elements that are replaced by others, in ascending order.
    std::uint64_t replacedCount = 0;
    std::byte const* replaced = nullptr; // their indices
    GltfScalar replacedScalar = GltfScalar::UnsignedInt;
    std::byte const* replacements = nullptr;

    std::size_t elementBytes() const;
    std::uint64_t replacedElement(std::uint64_t i) const;

    /// Calls `visit(element, bytes)` for all elements in their order.
    template <class Visit> void forEach(Visit&& visit) const
    {
        static constexpr std::byte kZeros[16 * sizeof(float)] = {};
        std::uint64_t next = 0;
        for (std::uint64_t element = 0; element < count; ++element) {
            bool const isReplaced = next != replacedCount && replacedElement(next) == element;
            visit(element, isReplaced ? replacements + next * elementBytes() : data ? data + element * stride : kZeros);
            next += isReplaced;
        }
    }
};

/// A glTF 2.0 file: its JSON, and access to its binary data. Everything that the JSON refers to is checked when it is
/// looked up; files from unknown sources are safe. Errors name the place in the JSON.
class GltfDocument final : public Scanner {
public:
    using Json = nlohmann::json;

    /// A binary file (.glb), or text (.gltf) whose binary data is in the text or in files beside it.
    explicit GltfDocument(InputFile const& file);

    bool isBinary() const { return isBinary_; }
    /// Bytes after the last chunk of a binary file.
    std::uint64_t bytesLeft() const { return bytesLeft_; }
    Json const& root() const { return root_; }

    /// What errors are about from now on, such as "mesh 2".
    void at(std::string place) { place_ = std::move(place); }

    /// The elements of an array of the root; empty if there is none.
    Json const& list(char const* name) const { return listIn(root_, name); }
    Json const& listIn(Json const& parent, char const* name) const;
    /// The object with this index in an array of the root.
    Json const& item(char const* list, std::uint64_t index) const;

    std::optional<std::uint64_t> findNumber(Json const& parent, char const* name) const;
    std::uint64_t number(Json const& parent, char const* name) const;
    std::string text(Json const& parent, char const* name) const;

    /// The accessor with this index.
    GltfArray array(std::uint64_t accessor);

private:
    struct Bytes {
        std::byte const* data = nullptr;
        std::uint64_t size = 0;
    };

    std::string location() const override { return place_; }

    std::string_view splitIntoChunks();
    void parse(std::string_view json);
    void checkVersionAndExtensions() const;
    Bytes buffer(std::uint64_t index);
    Bytes loadBuffer(Json const& json, std::uint64_t index);
    std::filesystem::path fileBeside(std::string const& uri) const;
    Bytes view(std::uint64_t index, std::uint64_t offset, std::uint64_t* stride);
    void readReplacements(Json const& sparse, GltfArray& array);
    GltfScalar scalarOf(Json const& parent) const;

    bool isBinary_ = false;
    std::uint64_t bytesLeft_ = 0;
    Json root_;
    Bytes chunk_; // the binary data in the file itself
    std::vector<std::optional<Bytes>> buffers_; // those looked up so far
    std::vector<std::vector<std::byte>> decoded_;
    std::vector<std::unique_ptr<InputFile>> files_;
    std::string place_;
};

}
