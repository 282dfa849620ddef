#pragma once

#include "support/MeshBuilder.h"

#include <OrvanCore/Array.h>

#include <benchmark/benchmark.h>

#include <array>
#include <cstdint>
#include <functional>
#include <map>
#include <string>
#include <vector>

// Row names tell the table how rows are related: "<name>/<size>" is compared with "<name>:memcpy/<size>", which copies the
// bytes of the same input into fresh memory on one thread, and with "<name>:<peer>/<size>".

namespace Benchmarks {

using benchmark::State;
using Tessara::Object;
using TestSupport::float3, TestSupport::MeshBuilder, TestSupport::PolygonMesh;
using Indices = Orvan::Array<unsigned int>;

/// The arguments of each run of a row; most rows have one, the number of elements.
using Sizes = std::vector<std::vector<std::int64_t>>;

inline std::size_t sizeOf(State const& state, std::size_t argument = 0)
{
    return static_cast<std::size_t>(state.range(argument));
}

/// Registers a row that is measured in wall time.
struct Row {
    Row(std::string const& name, Sizes const& sizes, std::function<void(State&)> const& run);
};

/// Registers the row `<name>:memcpy`, which copies into fresh memory from the allocator of the library's arrays.
struct CopyRow : Row {
    /// Bytes and elements; 0 elements if the row reports no time per element.
    using Input = std::array<std::size_t, 2>;
    CopyRow(std::string const& name, Sizes const& sizes, std::function<Input(State const&)> const& inputOf);
};

/// What `make(key)` returned first: meshes take longer to make than what is measured.
template <class Key, class Make> auto const& madeOnce(Key const& key, Make const& make)
{
    static std::map<Key, decltype(make(key))> made;
    auto const found = made.find(key);
    return found != made.end() ? found->second : made.emplace(key, make(key)).first->second;
}

/// A unit sphere, made once, with at least that many faces.
MeshBuilder const& sphereOf(std::size_t faces);
MeshBuilder const& shuffledSphereOf(std::size_t faces);
/// About that many quads, none of them planar.
PolygonMesh bentQuads(std::size_t faces);

/// A mesh in the library's arrays.
struct FlatMesh {
    Orvan::Array<float3> points;
    Indices faceVertex, faceOffset;

    explicit FlatMesh(PolygonMesh const& mesh)
        : points(mesh.points)
        , faceVertex(mesh.faceVertex)
        , faceOffset(mesh.faceOffset)
    {
    }
    unsigned int pointCount() const { return static_cast<unsigned int>(points.size); }
    unsigned int faceCount() const { return static_cast<unsigned int>(faceOffset.size - 1); }
};

/// Reports the wall time per element.
void countElements(State& state, std::size_t elements);

/// What the work allocates through `operator new`: the most at one time, and what is left when it ends.
struct Memory {
    std::int64_t peak;
    std::int64_t kept;
};
Memory memoryOf(std::function<void()> const& work);

/// Reports what the work allocates at one time beyond the bytes of its result.
void countWorkingBytes(State& state, std::size_t elements, std::size_t resultBytes, std::function<void()> const& work);

/// Times `run()`, and reports the wall time per element as all of these do.
template <class Run> void timeRuns(State& state, std::size_t elements, Run const& run)
{
    for (auto _ : state) {
        run();
        benchmark::ClobberMemory();
    }
    countElements(state, elements);
}

/// Times `run(made)`. Making and releasing what it runs on is not timed.
template <class Make, class Run> void timeOnEach(State& state, std::size_t elements, Make const& make, Run const& run)
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
    countElements(state, elements);
}

/// Times `run(copy)` on copies of the source. Copies of an object share its arrays, as those of a host's document do.
template <class Source, class Run>
void timeOnCopies(State& state, std::size_t elements, Source const& source, Run const& run)
{
    auto const copy = [&] { return source; };
    timeOnEach(state, elements, copy, run);
}

/// Times `edit(copy)` on copies of the source, and reports what it allocates beyond the bytes of the result.
template <class Edit>
void measureEdit(State& state, std::size_t elements, std::size_t resultBytes, Object const& source, Edit const& edit)
{
    timeOnCopies(state, elements, source, edit);
    Object object = source;
    countWorkingBytes(state, elements, resultBytes, [&] { edit(object); });
}

}
