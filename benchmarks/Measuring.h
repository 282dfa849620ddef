#pragma once

#include <OrvanCore/Array.h>
#include <TessaraObject/Object.h>

#include <benchmark/benchmark.h>

#include <cstdint>
#include <cstring>
#include <functional>
#include <map>
#include <vector>

// Row names tell the table how rows are related: "<name>/<size>" is compared with "<name>:memcpy/<size>", which copies the
// bytes of the same input into fresh memory on one thread, and with "<name>:<peer>/<size>".

namespace Benchmarks {

/// The arguments of each run of a row; most rows have one, the number of elements.
using Sizes = std::vector<std::vector<std::int64_t>>;

/// Registers a row that is measured in wall time.
template <class Run> void addRow(char const* name, Sizes const& sizes, Run const& run)
{
    auto* const row = benchmark::RegisterBenchmark(name, run);
    for (auto const& arguments : sizes)
        row->Args(arguments);
    row->UseRealTime();
}

inline std::size_t sizeOf(benchmark::State const& state, std::size_t argument = 0)
{
    return static_cast<std::size_t>(state.range(argument));
}

/// What `make(key)` returned first: meshes take longer to make than what is measured.
template <class Key, class Make> auto const& madeOnce(Key const& key, Make const& make)
{
    static std::map<Key, decltype(make(key))> made;
    auto const found = made.find(key);
    return found != made.end() ? found->second : made.emplace(key, make(key)).first->second;
}

/// Reports the wall time per element.
void countElements(benchmark::State& state, std::size_t elements);

/// The time of `memcpy` for that many bytes into fresh memory from the allocator of the library's arrays.
void copyBytes(benchmark::State& state, std::size_t bytes, std::size_t elements);

/// What the work allocates through `operator new`: the most at one time, and what is left when it ends.
struct Memory {
    std::int64_t peak;
    std::int64_t kept;
};
Memory memoryOf(std::function<void()> const& work);

/// Reports what the work allocates at one time beyond the bytes of its result.
void countWorkingBytes(
    benchmark::State& state, std::size_t elements, std::size_t resultBytes, std::function<void()> const& work);

/// Times `run(made)`. Making and releasing what it runs on is not timed.
template <class Make, class Run> void timeOnEach(benchmark::State& state, Make const& make, Run const& run)
{
    for (auto _ : state) {
        state.PauseTiming();
        {
            auto made = make();
            state.ResumeTiming();
            run(made);
            benchmark::ClobberMemory();
            state.PauseTiming();
        }
        state.ResumeTiming();
    }
}

/// Times `edit(object)` on objects that share the arrays of `source`, as those of a host's document do.
/// \return the edited object
template <class Edit> Orvan::MutablePtr<Tessara::Object> timeOnCopies(
    benchmark::State& state, Tessara::Object const& source, Edit const& edit)
{
    auto const copy = [&] {
        auto object = Tessara::createObject();
        *object = source;
        return object;
    };
    timeOnEach(state, copy, [&](auto& object) { edit(*object); });
    auto result = copy();
    edit(*result);
    return result;
}

/// Times a peer, which is copied before each run if `run` changes it.
template <class Peer, class Run>
void timePeer(benchmark::State& state, Peer const& peer, std::size_t elements, Run const& run)
{
    timeOnEach(
        state, [&] { return Peer(peer); }, run);
    countElements(state, elements);
}

}
