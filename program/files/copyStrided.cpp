#include "copyStrided.h"

#include <cstring>

namespace ModelingProgram {

namespace {

    template <std::size_t Bytes>
    void copyPieces(char const* from, std::size_t fromStride, char* to, std::size_t toStride, std::uint64_t count)
    {
        for (; count != 0; --count, from += fromStride, to += toStride)
            std::memcpy(to, from, Bytes); // a few instructions, since the size is a constant
    }

}

void copyStrided(
    void const* from, std::size_t fromStride, std::size_t bytes, void* to, std::size_t toStride, std::uint64_t count)
{
    auto const* source = static_cast<char const*>(from);
    auto* target = static_cast<char*>(to);
    if (bytes == fromStride && bytes == toStride)
        return static_cast<void>(std::memcpy(target, source, bytes * count));
    switch (bytes) {
    case 1:
        return copyPieces<1>(source, fromStride, target, toStride, count);
    case 2:
        return copyPieces<2>(source, fromStride, target, toStride, count);
    case 3:
        return copyPieces<3>(source, fromStride, target, toStride, count);
    case 4:
        return copyPieces<4>(source, fromStride, target, toStride, count);
    case 8:
        return copyPieces<8>(source, fromStride, target, toStride, count);
    case 12:
        return copyPieces<12>(source, fromStride, target, toStride, count);
    case 16:
        return copyPieces<16>(source, fromStride, target, toStride, count);
    case 24:
        return copyPieces<24>(source, fromStride, target, toStride, count);
    case 36:
        return copyPieces<36>(source, fromStride, target, toStride, count);
    default:
        for (; count != 0; --count, source += fromStride, target += toStride)
            std::memcpy(target, source, bytes);
    }
}

}
