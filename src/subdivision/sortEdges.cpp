#include "sortEdges.h"

#include <algorithm>
#include <array>
#include <bit>
#include <utility>

namespace Modeling::Internal {

namespace {

    bool haveSameStart(std::uint64_t a, std::uint64_t b)
    {
        return (a ^ b) >> 32 == 0;
    }

    struct Exchange {
        std::size_t low, high;
    };

    /// Calls `visit(exchange)` for Batcher's merge exchange, a sorting network.
    template <class Visit> constexpr void forEachExchange(std::size_t count, Visit const& visit)
    {
        std::size_t const top = std::bit_ceil(count) / 2;
        for (std::size_t p = top; p > 0; p /= 2) {
            std::size_t distance = p, remainder = 0;
            for (std::size_t q = top;; q /= 2) {
                for (std::size_t i = 0; i + distance < count; ++i)
                    if ((i & p) == remainder)
                        visit(Exchange{i, i + distance});
                if (q == p)
                    break;
                distance = q - p;
                remainder = p;
            }
        }
    }

    template <std::size_t kCount> constexpr auto sortingNetwork()
    {
        constexpr std::size_t kSize = [] {
            std::size_t size = 0;
            forEachExchange(kCount, [&](Exchange) { ++size; });
            return size;
        }();
        std::array<Exchange, kSize> network{};
        std::size_t size = 0;
        forEachExchange(kCount, [&](Exchange exchange) { network[size++] = exchange; });
        return network;
    }

    /// The value itself. Compilers would move two values at a time through memory, where the processor has to wait until both
    /// have been written.
    std::uint64_t inRegister(std::uint64_t value)
    {
        asm("" : "+r"(value));
        return value;
    }

    template <std::size_t kCount> bool sortFew(std::uint64_t const* edges, std::uint64_t* sorted)
    {
        static constexpr auto kNetwork = sortingNetwork<kCount>();
        std::array<std::uint64_t, kCount> edge;
        for (std::size_t i = 0; i != kCount; ++i)
            edge[i] = inRegister(edges[i]);
        auto const exchange = [&](std::uint64_t& low, std::uint64_t& high) {
            std::uint64_t const a = low, b = high;
            low = a < b ? a : b;
            high = a < b ? b : a;
        };
        [&]<std::size_t... kStep>(std::index_sequence<kStep...>)
        {
            (exchange(edge[kNetwork[kStep].low], edge[kNetwork[kStep].high]), ...);
        }
        (std::make_index_sequence<kNetwork.size()>());
        bool hasRepeats = false;
        for (std::size_t i = 0; i + 1 < kCount; ++i)
            hasRepeats |= haveSameStart(edge[i], edge[i + 1]);
        for (std::size_t i = 0; i != kCount; ++i)
            sorted[i] = inRegister(edge[i]);
        return hasRepeats;
    }

    // Most points have few edges. Networks have no branches, which would be unpredictable.
    constexpr std::array kSortFew{
        sortFew<1>, sortFew<2>, sortFew<3>, sortFew<4>, sortFew<5>, sortFew<6>, sortFew<7>, sortFew<8>};

}

bool sortEdges(std::uint64_t const* edges, std::size_t count, std::uint64_t* sorted)
{
    if (count == 0)
        return false;
    if (count <= kSortFew.size())
        return kSortFew[count - 1](edges, sorted);
    if (edges != sorted)
        std::copy_n(edges, count, sorted);
    std::sort(sorted, sorted + count);
    return std::adjacent_find(sorted, sorted + count, haveSameStart) != sorted + count;
}

}
