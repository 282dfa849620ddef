#include <TessaraGeometryVolume/Canceller.h>

#include <atomic>

namespace TSR {

namespace {

    std::atomic<std::uint64_t> calls{0};

}

void Canceller::cancelID(ID&) noexcept
{
    calls.fetch_add(1, std::memory_order_relaxed);
}

std::uint64_t Canceller::callCount() noexcept
{
    return calls.load(std::memory_order_relaxed);
}

void Canceller::resetCallCount() noexcept
{
    calls.store(0, std::memory_order_relaxed);
}

}
