#include "Files.h"

#include "files/Readers.h"

// Text files, each with all readers of texts. What they make of a file does not depend on how it is divided among
// threads.

namespace Fuzzing {

namespace {

    using ReadParts = GeometryFile (*)(InputFile const&, ReadOptions const&, std::size_t partBytes);

    GeometryFile readPlyText(InputFile const& file, ReadOptions const& options, std::size_t partBytes)
    {
        return readPly(file, options, PlyPath::Fastest, partBytes);
    }

    constexpr ReadParts kReaders[] = {readObj, readOff, readXyz, readPlyText, readStl};

}

}

extern "C" int LLVMFuzzerTestOneInput(std::uint8_t const* data, std::size_t size)
{
    using namespace Fuzzing;
    if (size == 0)
        return 0;
    auto const& path = storedFile(data, size);
    for (auto const reader : kReaders)
        for (bool const isLenient : {false, true}) {
            auto const readParts = [&](std::size_t partBytes) {
                return readChecked(path, isLenient, [&](InputFile const& file, ReadOptions const& options) {
                    return reader(file, options, partBytes);
                });
            };
            requireSame(readParts(20), readParts(1 << 20));
        }
    return 0;
}
