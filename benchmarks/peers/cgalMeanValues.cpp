#include "meanValues.h"

#include <CGAL/Barycentric_coordinates_2/Mean_value_coordinates_2.h>
#include <CGAL/Simple_cartesian.h>

#include <memory>

namespace Benchmarks {

namespace {

    template <class Number> std::function<void()> meanValues(std::vector<DrawnPolygon> const& polygons)
    {
        using Kernel = CGAL::Simple_cartesian<Number>;
        using Points = std::vector<typename Kernel::Point_2>;
        using Coordinates = CGAL::Barycentric_coordinates::Mean_value_coordinates_2<Points, Kernel>;
        struct Polygon {
            Points corners;
            Points points;
            std::unique_ptr<Coordinates> coordinates; // refers to the corners
        };
        auto const all = std::make_shared<std::vector<Polygon>>(polygons.size());
        for (std::size_t i = 0; i != polygons.size(); ++i) {
            Polygon& polygon = (*all)[i];
            for (auto const& corner : polygons[i].corners)
                polygon.corners.emplace_back(corner.x, corner.y);
            for (auto const& point : polygons[i].points)
                polygon.points.emplace_back(point.x, point.y);
            // Without a look for points on edges, which the library has.
            polygon.coordinates = std::make_unique<Coordinates>(
                polygon.corners, CGAL::Barycentric_coordinates::Computation_policy_2::FAST);
        }
        return [all, weights = std::vector<Number>(64)]() mutable {
            for (Polygon& polygon : *all)
                for (auto const& point : polygon.points)
                    (*polygon.coordinates)(point, weights.begin());
        };
    }

}

std::function<void()> cgalMeanValuesInFloat(std::vector<DrawnPolygon> const& polygons)
{
    return meanValues<float>(polygons);
}

std::function<void()> cgalMeanValuesInDouble(std::vector<DrawnPolygon> const& polygons)
{
    return meanValues<double>(polygons);
}

}
