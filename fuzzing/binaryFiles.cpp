#include "Files.h"

#include "files/Readers.h"

#include <string_view>

// Binary PLY and STL files, and glTF files with their JSON. A PLY file has the same contents if it is read element by
// element.

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size)
{
    using namespace Fuzzing;
    std::string_view const content(reinterpret_cast<char const*>(data), size);
    if (content.empty())
        return 0;
    auto const& path = storedFile(data, size);
    for (bool const isLenient : {false, true}) {
        if (content.starts_with("ply")) {
            auto const readBy = [&](PlyPath way) {
                return readChecked(path, isLenient, [&](InputFile const& file, ReadOptions const& options) {
                    return readPly(file, options, way, 1 << 20);
                });
            };
            requireSame(readBy(PlyPath::Fastest), readBy(PlyPath::General));
        } else if (content.starts_with("glTF") || content.starts_with("{")) {
            readChecked(path, isLenient, readGltf);
        } else {
            readChecked(path, isLenient,
                [](InputFile const& file, ReadOptions const& options) { return readStl(file, options); });
        }
    }
    return 0;
}
