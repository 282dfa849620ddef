#include <Modeling/removeSlivers.h>

#include "frame/VectorMath.h"
#include "support/Testing.h"

#include <bit>
#include <set>

using namespace Modeling;
using namespace TestSupport;
using Geometry::Mesh::removeSlivers;

namespace {

/// A plain reference that visits all faces for each collapse. For closed manifold meshes.
class PlainRemoval {
public:
    PlainRemoval(MeshBuilder const& mesh, float ratio)
        : points_(mesh.points)
        , faces_(mesh.faces)
    {
        for (auto const& [a, b, c] : faces_)
            normals_.push_back(normalOf(points_[a], points_[b], points_[c]));
        for (unsigned int face = 0; face != faces_.size(); ++face)
            visit(face, ratio);
        std::erase(faces_, kRemoved);
    }

    MeshBuilder result() const { return MeshBuilder::of(points_, faces_); }

private:
    using Triangle = MeshBuilder::Triangle;
    static constexpr Triangle kRemoved{kInvalidIndex, kInvalidIndex, kInvalidIndex};

    static float3 normalOf(float3 a, float3 b, float3 c) { return cross(safeNormalize(b - a), safeNormalize(c - a)); }

    void visit(unsigned int f, float ratio)
    {
        Triangle const face = faces_[f];
        if (face == kRemoved)
            return;
        float shortest = std::numeric_limits<float>::max(), longest = -shortest; // count if a length is infinite or NaN
        unsigned int e = 0;
        for (unsigned int k = 0; k != 3; ++k) {
            float const edge = length(points_[face[(k + 1) % 3]] - points_[face[k]]);
            e = shortest > edge ? k : e;
            shortest = shortest > edge ? edge : shortest;
            longest = longest < edge ? edge : longest;
        }
        if (longest * ratio > shortest)
            collapseIfAllowed(face[e], face[(e + 1) % 3]);
    }

    void collapseIfAllowed(unsigned int a, unsigned int b)
    {
        std::vector<unsigned int> between, around; // faces at both ends, and at one
        std::set<unsigned int> ringA, ringB, shared;
        for (unsigned int f = 0; f != faces_.size(); ++f) {
            bool const hasA = std::ranges::count(faces_[f], a), hasB = std::ranges::count(faces_[f], b);
            if (hasA)
                ringA.insert(faces_[f].begin(), faces_[f].end());
            if (hasB)
                ringB.insert(faces_[f].begin(), faces_[f].end());
            if (hasA || hasB)
                (hasA && hasB ? between : around).push_back(f);
        }
        std::ranges::set_intersection(ringA, ringB, std::inserter(shared, shared.end()));
        float3 const middle = (points_[a] + points_[b]) * 0.5f;
        // Each ring contains both ends too, so that two common neighbors make four shared points.
        bool const keepsLink = shared.size() == 4 && (ringA.size() != 4 || ringB.size() != 4);
        if (!keepsLink
            || !std::ranges::all_of(around, [&](unsigned int f) { return keepsOrientation(f, a, b, middle); }))
            return;
        points_[a] = middle;
        for (Triangle& face : faces_)
            std::ranges::replace(face, b, a);
        for (unsigned int const f : between)
            faces_[f] = kRemoved;
    }

    bool keepsOrientation(unsigned int f, unsigned int a, unsigned int b, float3 middle) const
    {
        Triangle const& face = faces_[f];
        auto const i = static_cast<unsigned int>(
            std::ranges::find_if(face, [=](unsigned int p) { return p == a || p == b; }) - face.begin());
        float3 const p0 = points_[face[i]], p1 = points_[face[(i + 1) % 3]], p2 = points_[face[(i + 2) % 3]];
        float3 const inward = cross(normalOf(p0, p1, p2), safeNormalize(p2 - p1));
        return !(dot(inward, middle - p1) <= 0) && !(dot(normalOf(middle, p1, p2), normals_[f]) <= 0); // NaN passes
    }

    std::vector<float3> points_, normals_;
    std::vector<Triangle> faces_;
};

Orvan::MutablePtr<Object> withoutSlivers(MeshBuilder const& builder, float ratio)
{
    auto mesh = builder.build();
    EXPECT_TRUE(removeSlivers(ratio, *mesh));
    return mesh;
}

/// Needles around two hubs whose collapses at ratio 0.03 depend on the collapses before them.
MeshBuilder dependentNeedlesAtHubs()
{
    constexpr unsigned int kUpper = 60, kLower = 61;
    MeshBuilder mesh = MeshBuilder::bipyramid(60);
    auto const cut = [&](unsigned int from, unsigned int to, float fraction) {
        auto const middle = static_cast<unsigned int>(mesh.points.size());
        mesh.points.push_back(mesh.points[from] + (mesh.points[to] - mesh.points[from]) * fraction);
        for (std::size_t face = 0, count = mesh.faces.size(); face != count; ++face)
            if (auto rest = mesh.faces[face]; std::ranges::count(rest, from) && std::ranges::count(rest, to)) {
                std::ranges::replace(mesh.faces[face], to, middle);
                std::ranges::replace(rest, from, middle);
                mesh.faces.push_back(rest);
            }
    };
    cut(kUpper, 0, 0.0004f);
    cut(5, kUpper, 0.001f); // collapses into point 5, which becomes a neighbor of the hub
    cut(kUpper, 6, 0.02f); // then has points 5 and 7 as neighbors that the hub has too
    cut(kLower, 0, 0.0004f); // collapses into the hub, which gets points 0 and 1 as neighbors
    cut(kLower, 1, 0.02f); // then has points 1 and 2 as neighbors that the hub has too
    return mesh;
}

/// A sphere with a few needles whose collapses at ratio 0.3 make short edges to points that no needle had.
MeshBuilder needlesThatReachFurther()
{
    MeshBuilder mesh = MeshBuilder::sphere(20);
    float fraction = 0.35f;
    for (std::size_t face = 40; face < mesh.faces.size(); face += 120, fraction += 0.004f) {
        auto const [a, b, c] = mesh.faces[face];
        mesh.points[b] = mesh.points[a] + (mesh.points[b] - mesh.points[a]) * 0.25f;
        mesh.points[c] = mesh.points[a] + (mesh.points[c] - mesh.points[a]) * fraction;
    }
    return mesh;
}

/// The bits of a position; the same for every NaN, because those depend on the compiler.
std::array<unsigned int, 3> bitsOf(float3 const& p)
{
    auto const bits = [](float c) { return c == c ? std::bit_cast<unsigned int>(c) : ~0u; };
    return {bits(p.x), bits(p.y), bits(p.z)};
}

/// The directed edges by the positions of their ends, and how often each occurs.
auto edgesOf(Object const& mesh, bool onlyOdd = false)
{
    auto const corners = valuesOf<unsigned int>(mesh, sFaceVertex);
    auto const positions = valuesOf<float3>(mesh, sPointPosition);
    std::map<std::array<std::array<unsigned int, 3>, 2>, int> edges;
    for (std::size_t corner = 0; corner != corners.size(); ++corner) {
        std::size_t const next = corner % 3 == 2 ? corner - 2 : corner + 1;
        ++edges[{bitsOf(positions[corners[corner]]), bitsOf(positions[corners[next]])}];
    }
    auto const all = edges;
    std::erase_if(edges, [&](auto const& edge) { // which is neither at a boundary nor non-manifold
        auto const opposite = all.find({edge.first[1], edge.first[0]});
        return onlyOdd && edge.second == 1 && opposite != all.end() && opposite->second == 1;
    });
    return edges;
}

}

TEST(RemoveSlivers, AgreesWithThePlainReferenceAndKeepsClosedSurfaces)
{
    std::map<std::string, MeshBuilder> meshes{
        {"tetrahedron", MeshBuilder::tetrahedron()},
        {"octahedron", MeshBuilder::sphere(1)},
        {"needles", MeshBuilder::sphere(8).withNeedles(40)},
        {"noise", MeshBuilder::sphere(12).withNoise(0.05f, 3).shuffled(4)},
        {"shuffled needles", MeshBuilder::sphere(10).withNeedles(150, 0.02f).withNoise(0.004f, 1).shuffled(2)},
        {"few needles in noise", MeshBuilder::sphere(20).withNeedles(60).withNoise(0.012f, 3)},
        {"few needles, shuffled", MeshBuilder::torus(60, 24).withNeedles(80, 0.002f).withNoise(0.02f, 5).shuffled(6)},
        {"torus", MeshBuilder::torus(24, 16).withNeedles(60).shuffled(9)},
        {"thin torus", MeshBuilder::torus(100, 3).withNoise(0.01f, 8)},
        {"bipyramid", MeshBuilder::bipyramid(300).withNoise(0.001f, 7)},
        {"wheel", MeshBuilder::wheel(120)},
        {"wheel with three radii", MeshBuilder::wheel(300, {0.02f, 1, 0.5f}).shuffled(3)},
        {"hubs with needles", MeshBuilder::wheel(90).withNeedles(150).withNoise(0.0002f, 3).shuffled(5)},
        {"dependent needles at hubs", dependentNeedlesAtHubs()},
        {"needles that reach further", needlesThatReachFurther()},
        {"needles that reach further, shuffled", needlesThatReachFurther().shuffled(8)},
        {"equal points", MeshBuilder::sphere(6).withNeedles(30, 0.0f)},
        {"two parts",
            MeshBuilder::sphere(5).withNeedles(9).joinedWith(MeshBuilder::torus(9, 9).withNeedles(5), {9, 0, 0})},
    };
    static float const kScales[] = {1, 1, 1e6f, 1e-18f};
    Random random(1);
    // Zero dot products, from right angles on a lattice and from underflow.
    for (unsigned int run = 0; run != 60; ++run) {
        MeshBuilder& mesh = meshes["lattice " + std::to_string(run)] = MeshBuilder::sphere(2);
        for (float3& p : mesh.points)
            p = float3{std::floor(2 * random.coordinate()), std::floor(2 * random.coordinate()),
                    std::floor(2 * random.coordinate())}
                * kScales[random.below(4)];
    }
    for (auto const& [name, builder] : meshes)
        for (float const ratio : {0.0f, 0.03f, 0.3f, 0.8f, 2.0f}) {
            SCOPED_TRACE(name + ", ratio " + std::to_string(ratio));
            auto const mesh = withoutSlivers(builder, ratio);
            EXPECT_EQ(edgesOf(*mesh), edgesOf(*PlainRemoval(builder, ratio).result().build()));
            EXPECT_TRUE(isClosedManifold(*mesh));
            EXPECT_EQ(countsOf(*mesh).eulerCharacteristic(), countsOf(*builder.build()).eulerCharacteristic());
        }
    EXPECT_EQ(countsOf(*withoutSlivers(meshes.at("needles"), 0.03f)), countsOf(*MeshBuilder::sphere(8).build()));
}

TEST(RemoveSlivers, MeasuresFacesExactlyAtTheRatioAndAtTheLimitsOfFloats)
{
    constexpr float kMax = std::numeric_limits<float>::max(), kLeast = std::numeric_limits<float>::denorm_min();
    constexpr float kInfinity = std::numeric_limits<float>::infinity();
    // Squares underflow, are not normal, or overflow; and so do lengths times ratios.
    for (float const scale : {1.0f, 1e-19f, 1e-21f, 1e-23f, 1e-30f, kLeast, 1e18f, 2e19f, 1e30f, kMax})
        for (unsigned int seed = 0; seed != 4; ++seed) {
            MeshBuilder builder = MeshBuilder::sphere(2).withNeedles(4, 0.3f).withNoise(0.1f, seed);
            for (float3& p : builder.points)
                p = p * scale;
            builder.points[seed].x = seed == 3 ? kNan : builder.points[seed].x;
            std::vector<float> ratios{0, -1, -2, kNan, kInfinity, -kInfinity, kMax, kLeast, 1e-20f, 1e20f};
            for (auto const& [a, b, c] : builder.faces) {
                float const ab = length(builder.points[b] - builder.points[a]);
                float const bc = length(builder.points[c] - builder.points[b]);
                float const atLimit = ab / bc;
                ratios.insert(ratios.end(),
                    {std::nextafter(atLimit, 0.0f), atLimit, std::nextafter(atLimit, 2.0f), atLimit * (1 + 1e-6f)});
            }
            for (float const ratio : ratios) {
                SCOPED_TRACE(scale);
                SCOPED_TRACE(ratio);
                EXPECT_EQ(
                    edgesOf(*withoutSlivers(builder, ratio)), edgesOf(*PlainRemoval(builder, ratio).result().build()));
            }
        }
}

TEST(RemoveSlivers, LeavesOtherInputUnchanged)
{
    auto const polygons = makeMesh({{0, 0, 0}, {1, 0, 0}, {1, 0.01f, 0}, {0, 0.01f, 0}}, {0, 1, 2, 3}, {0, 4});
    auto const mixed = makeMesh({{0, 0, 0}, {1, 0, 0}, {1, 0.01f, 0}}, {0, 1, 0, 1, 2, 1}, {0, 2, 6});
    auto const incomplete = MeshBuilder::sphere(4).withNeedles(9).build();
    incomplete->eraseProperty(sFaceOffset);
    auto const otherType = MeshBuilder::sphere(4).withNeedles(9).build();
    addDataProperty<int>(sFaceVertex, sFaceVertexComp, {1, 2, 3}, *otherType);
    auto const empty = MeshBuilder().build();
    auto const open = MeshBuilder::of({{0, 0, 0}, {9, 0, 0}, {9, 9, 0}, {9, 9.1f, 0}}, {{0, 1, 2}, {0, 2, 3}}).build();
    auto const shortOffsets = MeshBuilder::sphere(4).withNeedles(9).build();
    auto offsets = *dataOf<unsigned int>(*shortOffsets, sFaceOffset);
    offsets.resize(offsets.size - 1); // the last one remains in memory behind the end
    addDataProperty<unsigned int>(sFaceOffset, sFaceComp, std::move(offsets), *shortOffsets);
    for (auto const* const mesh : {&polygons, &mixed, &incomplete, &otherType, &empty, &open, &shortOffsets}) {
        auto const before = deepCopy(**mesh);
        auto const positions = dataOf<float3>(**mesh, sPointPosition);
        EXPECT_TRUE(removeSlivers(0.9f, **mesh));
        EXPECT_TRUE(sameContents(**mesh, *before));
        EXPECT_EQ(dataOf<float3>(**mesh, sPointPosition), positions) << "written";
    }
}

TEST(RemoveSlivers, SurvivesSoupsAndPositionsThatAreNotFinite)
{
    Random random(1);
    for (unsigned int run = 0; run != 3000; ++run) {
        SCOPED_TRACE(run);
        unsigned int const kind = run % 3, changedOneIn = kind == 0 ? 1 : kind == 1 ? 16 : 60; // of the corners
        MeshBuilder soup = kind == 1 ? MeshBuilder::sphere(2) : MeshBuilder::wheel(60); // which has hubs
        if (kind == 0)
            soup = MeshBuilder::of(std::vector<float3>(6 + random.below(20)), std::vector<MeshBuilder::Triangle>(30));
        soup = std::move(soup).withNoise(1, run);
        std::size_t const pointCount = soup.points.size();
        bool const isPinched = run % 6 == 5; // two points become one, which hubs have as a neighbor twice
        unsigned int const replaced = random.below(pointCount), other = random.below(pointCount);
        for (auto& face : soup.faces)
            for (unsigned int& corner : face)
                if (isPinched)
                    corner = corner == replaced ? other : corner;
                else if (random.below(changedOneIn) == 0)
                    corner = random.below(pointCount);
        auto const mesh = withoutSlivers(soup, 0.7f);
        EXPECT_TRUE(isValid(*mesh));
        EXPECT_EQ(edgesOf(*mesh, true), edgesOf(*soup.build(), true));
        // If all positions are NaN every face is a sliver for this ratio and none flips: topology alone decides.
        soup.points.assign(pointCount, float3{kNan, kNan, kNan});
        EXPECT_TRUE(isValid(*withoutSlivers(soup, -2)));
    }
    float const infinity = std::numeric_limits<float>::infinity();
    for (float const odd : {kNan, infinity, -infinity, 3e38f})
        for (float const ratio : {0.1f, -2.0f, kNan, infinity}) {
            auto builder = MeshBuilder::sphere(5).withNeedles(20);
            for (std::size_t point = 0; point < builder.points.size(); point += 3)
                builder.points[point].y = odd;
            EXPECT_TRUE(isClosedManifold(*withoutSlivers(builder, ratio))) << odd << ", ratio " << ratio;
        }
}

TEST(RemoveSlivers, StaysLinearAroundAHub)
{
    EXPECT_LT(countsOf(*withoutSlivers(MeshBuilder::bipyramid(100'000), 0.1f)).faces, 200'000);
    // All short edges end at the hubs. Only one collapses: it joins the hubs, after which the ends of the other spokes
    // share too many neighbors, or faces far away would flip. One walk around a hub per spoke would take hours.
    EXPECT_EQ(countsOf(*withoutSlivers(MeshBuilder::wheel(400'000), 0.5f)).faces, 800'000 - 2);
    EXPECT_TRUE(isValid(*withoutSlivers(MeshBuilder::wheel(300'000, {0.02f, 1, 0.5f}), 0.5f)));
}
