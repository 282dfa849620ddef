#include "triangulation/triangulatePolygon.h"

#include "support/Random.h"

#include <TessaraGeometry/Names.h>
#include <TessaraSpatial/SpatialQuery.h>

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <limits>
#include <map>
#include <numeric>
#include <string>
#include <vector>

using namespace TestSupport;
using Tessara::Math::float2;
using Tessara::Math::float3;

namespace {

using Corners = std::vector<float3>;
using Triangles = std::vector<unsigned int>;

constexpr float kNan = std::numeric_limits<float>::quiet_NaN();

Triangles triangulated(Corners const& corners)
{
    static Modeling::Internal::PolygonStorage storage; // used again, as in a mesh
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

/// Ear clipping once more, written plainly: the ring is walked, every ear is measured anew, all corners are scanned.
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
    static float lengthOf(float3 v) { return std::sqrt(v.x * v.x + v.y * v.y + v.z * v.z); }
    static float3 direction(float3 a, float3 b)
    {
        float3 const v{b.x - a.x, b.y - a.y, b.z - a.z};
        float const factor = 1 / lengthOf(v);
        return lengthOf(v) > 1.17549435e-38f ? float3{v.x * factor, v.y * factor, v.z * factor} : v;
    }

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
        float const squared = n.x * n.x + n.y * n.y + n.z * n.z;
        if (1e-8f > squared)
            return false;
        float const norm = std::sqrt(squared);
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
        float3 const e1 = direction(p_[i], p_[b]), e0 = direction(p_[i], p_[a]);
        float quality = 1 - (e1.x * e0.x + e1.y * e0.y + e1.z * e0.z);
        quality = 2.0f > quality ? quality : 2.0f;
        quality_[i] = quality > 0.0f ? quality : 0.0f;
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

/// Twice the area vector, in double precision.
std::array<double, 3> areaOf(Corners const& p, std::vector<unsigned int> const& corners)
{
    std::array<double, 3> area{};
    for (std::size_t i = 2; i < corners.size(); ++i) {
        float3 const &a = p[corners[0]], &b = p[corners[i - 1]], &c = p[corners[i]];
        double const bx = double{b.x} - a.x, by = double{b.y} - a.y, bz = double{b.z} - a.z;
        double const cx = double{c.x} - a.x, cy = double{c.y} - a.y, cz = double{c.z} - a.z;
        area[0] += by * cz - bz * cy;
        area[1] += bz * cx - bx * cz;
        area[2] += bx * cy - by * cx;
    }
    return area;
}

/// All triangles look to the polygon's side, and together have its area: for a simple polygon, a cut without overlap.
testing::AssertionResult cutsWithoutOverlap(Corners const& p)
{
    std::vector<unsigned int> all(p.size());
    std::iota(all.begin(), all.end(), 0u);
    auto const whole = areaOf(p, all);
    double const wholeArea = std::hypot(whole[0], whole[1], whole[2]);
    Triangles const triangles = triangulated(p);
    double sum = 0;
    for (std::size_t t = 0; t != triangles.size(); t += 3) {
        auto const area = areaOf(p, {triangles[t], triangles[t + 1], triangles[t + 2]});
        double const signedArea = (area[0] * whole[0] + area[1] * whole[1] + area[2] * whole[2]) / wholeArea;
        if (signedArea < -1e-6 * wholeArea)
            return testing::AssertionFailure() << "triangle " << t / 3 << " looks to the other side";
        sum += std::abs(signedArea);
    }
    if (std::abs(sum - wholeArea) > 1e-5 * wholeArea)
        return testing::AssertionFailure() << "the triangles cover " << sum / wholeArea << " of the polygon";
    return testing::AssertionSuccess();
}

float3 onUnitCircle(double turn)
{
    return {static_cast<float>(std::cos(6.283185307179586 * turn)),
        static_cast<float>(std::sin(6.283185307179586 * turn)), 0};
}

Corners convex(std::size_t n, Random&)
{
    Corners corners;
    for (std::size_t i = 0; i != n; ++i)
        corners.push_back(onUnitCircle(static_cast<double>(i) / static_cast<double>(n)));
    return corners;
}

Corners star(std::size_t n, Random& random)
{
    Corners corners = convex(n, random);
    for (float3& p : corners) {
        float const radius = 1.1f + random.coordinate();
        p = {radius * p.x, radius * p.y, 0};
    }
    return corners;
}

/// Out along one arm and back along another one beside it.
Corners spiral(std::size_t n, Random&)
{
    Corners corners;
    std::size_t const half = n / 2;
    for (std::size_t i = 0; i != 2 * half; ++i) {
        bool const isBack = i >= half;
        double const t = static_cast<double>(isBack ? 2 * half - 1 - i : i) / 12;
        float3 const p = onUnitCircle(t);
        auto const radius = static_cast<float>(1 + t - (isBack ? 0.4 : 0));
        corners.push_back({radius * p.x, radius * p.y, 0});
    }
    return corners;
}

/// Teeth over a bar; the tips and the feet each lie on one line.
Corners comb(std::size_t n, Random&)
{
    Corners corners;
    std::size_t const teeth = std::max<std::size_t>(1, n / 2);
    for (std::size_t tooth = 0; tooth != teeth; ++tooth) {
        corners.push_back({static_cast<float>(tooth), 0, 0});
        corners.push_back({static_cast<float>(tooth) + 0.5f, 3, 0});
    }
    corners.push_back({static_cast<float>(teeth), 0, 0});
    corners.push_back({static_cast<float>(teeth), -1, 0});
    corners.push_back({0, -1, 0});
    std::reverse(corners.begin(), corners.end());
    return corners;
}

/// Around the unit lattice squares under a random staircase: many collinear corners.
Corners staircase(std::size_t n, Random& random)
{
    Corners corners{{0, 0, 0}};
    float height = 1;
    std::size_t const columns = n / 3 + 1;
    for (std::size_t x = 0; x != columns; ++x)
        corners.push_back({static_cast<float>(x + 1), 0, 0});
    for (std::size_t x = columns; x != 0; --x) {
        height = static_cast<float>(1 + random.below(3));
        if (corners.back().y != height)
            corners.push_back({static_cast<float>(x), height, 0});
        corners.push_back({static_cast<float>(x) - 1, height, 0});
    }
    return corners;
}

/// A square with square holes in a row, each bridged to the next: bridges are walked twice.
Corners bridgedHoles(std::size_t n, Random&)
{
    std::size_t const holes = n / 8 + 1;
    auto const width = static_cast<float>(2 * holes + 1);
    Corners corners{{0, 0, 0}, {width, 0, 0}, {width, 3, 0}, {0, 3, 0}, {0, 1, 0}};
    for (std::size_t hole = 0; hole != holes; ++hole) {
        auto const x = static_cast<float>(2 * hole + 1);
        corners.insert(corners.end(), {{x, 1, 0}, {x, 2, 0}, {x + 1, 2, 0}, {x + 1, 1, 0}});
    }
    for (std::size_t x = 2 * holes - 1; x != 0; --x)
        corners.push_back({static_cast<float>(x), 1, 0});
    corners.push_back({0, 1, 0});
    return corners;
}

using Family = Corners (*)(std::size_t, Random&);
std::map<std::string, Family> const kFamilies{{"convex", convex}, {"star", star}, {"spiral", spiral}, {"comb", comb},
    {"staircase", staircase}, {"bridged holes", bridgedHoles}};

/// Turned into a random plane, scaled and moved.
Corners placed(Corners corners, float scale, Random& random)
{
    std::array<float, 3> const angles{random.coordinate() * 4, random.coordinate() * 4, random.coordinate() * 4};
    float3 const offset{random.coordinate(), random.coordinate(), random.coordinate()};
    for (float3& p : corners) {
        std::array<float*, 3> const axes{&p.x, &p.y, &p.z};
        for (std::size_t axis = 0; axis != 3; ++axis) {
            float& a = *axes[axis];
            float& b = *axes[(axis + 1) % 3];
            float const c = std::cos(angles[axis]), s = std::sin(angles[axis]);
            float const turned = c * a - s * b;
            b = s * a + c * b;
            a = turned;
        }
        p = {scale * (p.x + offset.x), scale * (p.y + offset.y), scale * (p.z + offset.z)};
    }
    return corners;
}

/// Corners of any kind: on a coarse lattice they repeat, line up and intersect; some are not even numbers.
Corners soup(std::size_t n, Random& random)
{
    static float const kScales[] = {0.01f, 1, 1, 1, 1e4f, 1e18f};
    unsigned int const lattice = random.below(3);
    float const flatness = random.below(2) ? 0.0f : 0.3f;
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

TEST(TriangulatePolygon, cutsOrFallsBackToTheFan)
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
        {"reflex, but of less area than is looked at",
            {{{0.001f, 0.001f, 0}, {0, 0.003f, 0}, {0, 0, 0}, {0.003f, 0, 0}}, fan(4)}},
        {"two equal corners in a row, which never become ears",
            {{{0, 0, 0}, {1, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}}, fan(5)}},
        {"bow-tie without area", {{{0, 0, 0}, {1, 1, 0}, {1, 0, 0}, {0, 1, 0}}, fan(4)}},
        {"not numbers", {{{0, 0, 0}, {1, kNan, 0}, {1, 1, 0}, {0, 1, 0}, {0, 0.5f, 0}}, fan(5)}},
        {"triangle without area", {{{0, 0, 0}, {0, 0, 0}, {2, 0, 0}}, {0, 1, 2}}},
        {"two corners", {{{0, 0, 0}, {1, 0, 0}}, {}}},
    };
    for (auto const& [name, polygon] : cases)
        EXPECT_EQ(triangulated(polygon.corners), polygon.triangles) << name;
}

TEST(TriangulatePolygon, agreesWithPlainEarClipping)
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
    for (auto const& [name, make] : kFamilies)
        for (int run = 0; run != 100; ++run) {
            Corners const polygon = placed(make(6 + random.below(run % 10 ? 20 : 200), random), 1, random);
            ASSERT_EQ(triangulated(polygon), PlainReference(polygon).triangles) << name << ' ' << run;
        }
}

TEST(TriangulatePolygon, cutsSimplePolygonsWithoutOverlap)
{
    Random random(2);
    for (auto const& [name, make] : kFamilies)
        for (float const scale : {0.05f, 1.0f, 1e6f})
            for (int run = 0; run != 100; ++run) {
                Corners const flat = make(6 + random.below(60), random);
                EXPECT_TRUE(cutsWithoutOverlap(placed(flat, scale, random))) << name << ' ' << run << ' ' << scale;
            }
}

TEST(TriangulatePolygon, cutsPolygonsOfManyThousandCorners)
{
    Random random(3);
    for (auto const& [name, make] : kFamilies)
        EXPECT_TRUE(cutsWithoutOverlap(make(10'000, random))) << name;
}
