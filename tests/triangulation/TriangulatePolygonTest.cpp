#include "triangulation/triangulatePolygon.h"

#include "frame/VectorMath.h"
#include "support/Testing.h"

#include <TessaraSpatial/SpatialQuery.h>

using namespace TestSupport;
using namespace Modeling;
using Tessara::Math::float2;

namespace {

using Corners = std::vector<float3>;
using Triangles = std::vector<unsigned int>;

Triangles triangulated(Corners const& corners)
{
    static Modeling::Internal::PolygonStorage storage; // reused, as for the faces of a mesh
    Triangles triangles(3 * (corners.size() - 2), 12345);
    Modeling::Internal::triangulatePolygon(corners, triangles, storage);
    return triangles;
}

Triangles fan(std::size_t cornerCount)
{
    Triangles triangles;
    for (unsigned int k = 2; k < cornerCount; ++k)
        triangles.insert(triangles.end(), {0, k - 1, k});
    return triangles;
}

/// Plain ear clipping: walks the ring, measures every changed ear and scans all corners for each cut.
class PlainReference {
public:
    explicit PlainReference(Corners const& corners)
        : p_(corners)
        , n_(corners.size())
    {
        for (std::size_t i = 0; i != n_; ++i) {
            previous_.push_back((i + n_ - 1) % n_);
            next_.push_back((i + 1) % n_);
        }
        if (n_ < 4 || !project() || !clip())
            triangles = fan(n_);
    }

    Triangles triangles;

private:
    struct Quaternion {
        float x, y, z, w;
    };
    static Quaternion product(Quaternion a, Quaternion b)
    {
        return {a.w * b.x + a.x * b.w + a.y * b.z - a.z * b.y, a.w * b.y + a.y * b.w + a.z * b.x - a.x * b.z,
            a.w * b.z + a.z * b.w + a.x * b.y - a.y * b.x, a.w * b.w - a.x * b.x - a.y * b.y - a.z * b.z};
    }

    bool project()
    {
        float3 n{0, 0, 0};
        for (std::size_t i = 0; i != n_; ++i) {
            float3 const &p = p_[previous_[i]], &q = p_[next_[i]];
            n.z += (q.y - p.y) * p_[i].x;
            n.x += (q.z - p.z) * p_[i].y;
            n.y += (q.x - p.x) * p_[i].z;
        }
        if (1e-8f > dot(n, n))
            return false;
        float const norm = length(n);
        n = {n.x / norm, n.y / norm, n.z / norm};
        float const w = n.z + 1;
        Quaternion q{n.z, -n.y, n.x, 0};
        if (!(1e-5f > w)) {
            float const size = std::sqrt(n.y * n.y + n.x * n.x + 0.0f * 0.0f + w * w);
            q = {n.y / size, -n.x / size, 0 / size, w / size};
        }
        for (float3 const& p : p_) {
            Quaternion const r = product(product(q, {p.x, p.y, p.z, 0}), {-q.x, -q.y, -q.z, q.w});
            projected_.push_back({r.x, r.y});
        }
        return true;
    }

    bool isEar(std::size_t i)
    {
        using namespace Tessara::SpatialQuery;
        std::size_t const a = previous_[i], b = next_[i];
        if (static_cast<int>(pointEdgeOrientation(projected_[a], projected_[i], projected_[b])) != 1)
            return false;
        float u, v, w;
        for (std::size_t c = next_[b]; c != a; c = next_[c])
            if (pointInTriangle(projected_[c], projected_[a], projected_[i], projected_[b], u, v, w, nullptr))
                return false;
        float const quality = 1 - dot(safeNormalize(p_[b] - p_[i]), safeNormalize(p_[a] - p_[i]));
        quality_[i] = !(2.0f > quality) ? 2.0f : quality > 0.0f ? quality : 0.0f;
        return true;
    }

    bool clip()
    {
        quality_.assign(n_, 2.0f);
        std::vector<bool> ear(n_);
        for (std::size_t i = 0; i != n_; ++i)
            ear[i] = isEar(i);
        for (;;) {
            std::size_t best = n_;
            for (std::size_t i = 0; i != n_; ++i)
                if (ear[i] && (best == n_ || quality_[best] > quality_[i] + 0.0001f))
                    best = i;
            if (best == n_)
                break;
            std::size_t const a = previous_[best], b = next_[best];
            next_[a] = b;
            previous_[b] = a;
            ear[best] = false;
            ear[a] = isEar(a);
            ear[b] = isEar(b);
            for (std::size_t const corner : {a, best, b})
                triangles.push_back(static_cast<unsigned int>(corner));
        }
        return triangles.size() >= 3 * (n_ - 2);
    }

    Corners const& p_;
    std::size_t n_;
    std::vector<std::size_t> previous_, next_;
    std::vector<float2> projected_;
    std::vector<float> quality_;
};

/// Polygons of any kind: on a coarse lattice, corners coincide or are collinear, and edges intersect. Some corners are
/// NaN or infinite.
Corners soup(std::size_t n, Random& random)
{
    static float const kScales[] = {0.01f, 1, 1, 1, 1e4f, 1e18f};
    unsigned int const lattice = random.below(3);
    static float const kFlatness[] = {0, 0.3f, 0.005f}; // the last one tilts normals from -z by about the tolerance
    float const flatness = kFlatness[random.below(3)];
    float const scale = kScales[random.below(6)];
    Corners corners(n);
    for (float3& p : corners) {
        auto const coordinate = [&] {
            float const c = random.coordinate();
            return lattice == 0 ? c : std::round(c * static_cast<float>(lattice));
        };
        float const x = coordinate(), y = coordinate();
        p = {scale * x, scale * y, scale * flatness * coordinate()};
        if (random.below(400) == 0)
            p.x = random.below(2) ? kNan : std::numeric_limits<float>::infinity();
    }
    return corners;
}

#if defined(NDEBUG) && !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)
constexpr int kManyTimes = 40;
#else
constexpr int kManyTimes = 1;
#endif

}

TEST(TriangulatePolygon, CutsOrFallsBackToTheFan)
{
    struct Case {
        Corners corners;
        Triangles triangles;
    };
    std::map<std::string, Case> const cases{
        {"unit square", {{{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}}, {3, 0, 1, 3, 1, 2}}},
        {"clockwise", {{{0, 0, 0}, {0, 1, 0}, {1, 1, 0}, {1, 0, 0}}, {3, 0, 1, 3, 1, 2}}},
        {"sharp at corner 1", {{{0, 0, 0}, {3, 0, 0}, {1, 1, 0}, {0, 1, 0}}, {0, 1, 2, 3, 0, 2}}},
        {"no sharper than the hysteresis", {{{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0.00005f, 1, 0}}, {3, 0, 1, 3, 1, 2}}},
        {"reflex at corner 0", {{{1, 1, 0}, {0, 3, 0}, {0, 0, 0}, {3, 0, 0}}, {0, 1, 2, 2, 3, 0}}},
        {"all corners on a line", {{{0, 0, 0}, {1, 0, 0}, {2, 0, 0}, {3, 0, 0}}, fan(4)}},
        {"all corners equal", {{{1, 2, 3}, {1, 2, 3}, {1, 2, 3}, {1, 2, 3}, {1, 2, 3}}, fan(5)}},
        {"reflex, but below the smallest area",
            {{{0.001f, 0.001f, 0}, {0, 0.003f, 0}, {0, 0, 0}, {0.003f, 0, 0}}, fan(4)}},
        {"two equal consecutive corners, which never become ears",
            {{{0, 0, 0}, {1, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}}, fan(5)}},
        {"bow-tie without area", {{{0, 0, 0}, {1, 1, 0}, {1, 0, 0}, {0, 1, 0}}, fan(4)}},
        {"NaN", {{{0, 0, 0}, {1, kNan, 0}, {1, 1, 0}, {0, 1, 0}, {0, 0.5f, 0}}, fan(5)}},
        {"triangle without area", {{{0, 0, 0}, {0, 0, 0}, {2, 0, 0}}, {0, 1, 2}}},
        {"two corners", {{{0, 0, 0}, {1, 0, 0}}, {}}},
    };
    for (auto const& [name, polygon] : cases)
        EXPECT_EQ(triangulated(polygon.corners), polygon.triangles) << name;
}

TEST(TriangulatePolygon, AgreesWithPlainEarClipping)
{
    Random random(1);
    for (int run = 0; run != 50'000 * kManyTimes; ++run) {
        Corners const quad = soup(4, random);
        ASSERT_EQ(triangulated(quad), PlainReference(quad).triangles) << "quad " << run;
    }
    for (int run = 0; run != 1000 * kManyTimes; ++run) {
        Corners const polygon = soup(5 + random.below(run % 50 ? 12 : 150), random);
        ASSERT_EQ(triangulated(polygon), PlainReference(polygon).triangles) << "polygon " << run;
    }
    for (unsigned int run = 0; run != 400; ++run) { // simple polygons, mostly concave
        unsigned int const corners = run == 0 ? 3000 : 6 + random.below(run % 10 ? 20 : 200);
        Corners const polygon = PolygonMesh::stars(1, corners, corners, run).points;
        ASSERT_EQ(triangulated(polygon), PlainReference(polygon).triangles) << "star " << run;
    }
}
