#pragma once

#include <Modeling/StitchTemplate.h>

#include <cmath>
#include <map>
#include <string>
#include <utility>
#include <vector>

namespace PlainStitch {

using Tessara::Math::float3;
using Tessara::Modeling::pair;
using Weights = std::vector<float>;

/// What a template is to hold: written as it is defined, corner by corner, with no care for time or memory.
struct Template {
    unsigned int polySize = 0;
    std::vector<std::vector<Weights>> strands;
    std::vector<std::vector<pair>> edges;
    std::string errors;
    float tol = 0.02f;

    unsigned int coordinates(Orvan::Array<float3> const& polygon, float3 const& point, Weights& weights, float scale)
    {
        unsigned int const n = polySize;
        weights[n] = point.z / scale;
        std::vector<float> x(n), y(n), r(n), area(n), dot(n);
        for (unsigned int i = 0; i < n; ++i) {
            x[i] = polygon[i].x - point.x, y[i] = polygon[i].y - point.y;
            r[i] = std::sqrt(x[i] * x[i] + y[i] * y[i]);
            if (tol > r[i]) {
                weights[i] = 1;
                errors += "---control point too close to polygon vertex---";
                return 0xFFFFFFFF;
            }
        }
        float const areaTol = tol * scale;
        for (unsigned int i = 0; i < n; ++i) {
            unsigned int const j = (i + 1) % n;
            area[i] = (y[j] * x[i] - y[i] * x[j]) * 0.5f;
            dot[i] = y[i] * y[j] + x[i] * x[j];
            if (areaTol > std::fabs(area[i]) && 0.0f > dot[i]) {
                weights[i] = r[j] / (r[j] + r[i]);
                weights[j] = 1.0f - weights[i];
                return i; // both are from 0 to 1
            }
        }
        float sum = 0;
        for (unsigned int i = 0; i < n; ++i) {
            unsigned int const j = (i + 1) % n, h = (i + n - 1) % n;
            if (std::fabs(area[h]) >= areaTol)
                weights[i] += (r[h] - dot[h] / r[i]) / area[h];
            if (std::fabs(area[i]) >= areaTol)
                weights[i] += (r[j] - dot[i] / r[i]) / area[i];
            sum += weights[i];
        }
        for (unsigned int i = 0; i < n; ++i) {
            weights[i] /= sum;
            if (-0.2f > weights[i])
                errors += "---point lies too far out side of polygon---";
        }
        return 0xFFFFFFFF;
    }

    void fill(Orvan::Array<float3> const& polygon, Orvan::Array<float3> const& positions,
        Orvan::Array<unsigned int> const& offsets, bool strict)
    {
        polySize = static_cast<unsigned int>(polygon.size);
        edges.resize(polySize);
        float scale = 0;
        for (unsigned int i = 0; i < polySize; ++i) {
            float3 const &a = polygon[i], &b = polygon[(i + 1) % polySize];
            scale += std::sqrt((b.x - a.x) * (b.x - a.x) + (b.y - a.y) * (b.y - a.y));
        }
        scale /= static_cast<float>(polySize);
        tol *= scale;
        for (unsigned int strand = 0; strand + 1 < offsets.size; ++strand) {
            strands.emplace_back();
            for (unsigned int p = offsets[strand]; p < offsets[strand + 1]; ++p) {
                Weights weights(polySize + 1);
                unsigned int const edge = coordinates(polygon, positions[p], weights, scale);
                if (p == offsets[strand])
                    end({strand, false}, edge, weights, strict);
                if (p == offsets[strand + 1] - 1)
                    end({strand, true}, edge, weights, strict);
                strands.back().push_back(weights);
            }
        }
        for (unsigned int i = 0; i < polySize; ++i)
            order(i, strict);
    }

    void end(pair const& place, unsigned int edge, Weights const& weights, bool strict)
    {
        std::string const which = place.end ? "ending" : "starting";
        if (edge != 0xFFFFFFFF && weights[edge] > 0 && weights[(edge + 1) % polySize] > 0)
            edges[edge].push_back(place);
        else if (edge != 0xFFFFFFFF)
            errors += "---strand " + which + " point on edge but outside of polygon---";
        else if (strict)
            errors += "---strand " + which + " point not on polygon edge---";
    }

    void order(unsigned int i, bool strict)
    {
        auto const weightOf = [this](pair const& place, unsigned int corner) {
            return (place.end ? strands[place.strand].back() : strands[place.strand].front())[corner];
        };
        std::vector<pair>& ends = edges[i];
        if (ends.size() == 2) {
            if (weightOf(ends[1], i) > weightOf(ends[0], i))
                std::swap(ends[0], ends[1]);
        } else if (ends.size() != 1 && strict) {
            errors += "---polygon edge contains too few/many strand end points---";
        } else if (ends.size() > 2) {
            std::map<float, std::size_t> places;
            for (std::size_t k = 0; k < ends.size(); ++k)
                places[weightOf(ends[k], (i + 1) % polySize)] = k;
            std::vector<pair> const recorded = std::exchange(ends, {});
            for (auto const& [weight, k] : places)
                ends.push_back(recorded[k]);
        }
    }
};

}
