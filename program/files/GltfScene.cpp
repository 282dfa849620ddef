#include "GltfScene.h"

#include <TessaraMathSupport/Types.h>

#include <array>

namespace ModelingProgram {

using Tessara::Math::double3;

namespace {

    using Json = GltfDocument::Json;

    /// The numbers of an array of this length; nullopt if there is none.
    template <std::size_t N>
    std::optional<std::array<double, N>> findNumbers(GltfDocument const& document, Json const& node, char const* name)
    {
        auto const found = node.find(name);
        if (found == node.end())
            return std::nullopt;
        std::array<double, N> numbers{};
        if (!found->is_array() || found->size() != N)
            document.refuse(std::string(name) + " is not an array of " + std::to_string(N) + " numbers");
        for (std::size_t i = 0; i < N; ++i) {
            if (!(*found)[i].is_number())
                document.refuse(std::string(name) + " is not an array of " + std::to_string(N) + " numbers");
            numbers[i] = (*found)[i].get<double>();
        }
        return numbers;
    }

    GltfTransform rotationBy(std::array<double, 4> const& q)
    {
        auto const [x, y, z, w] = q;
        return {{{1 - 2 * (y * y + z * z), 2 * (x * y - z * w), 2 * (x * z + y * w)},
                    {2 * (x * y + z * w), 1 - 2 * (x * x + z * z), 2 * (y * z - x * w)},
                    {2 * (x * z - y * w), 2 * (y * z + x * w), 1 - 2 * (x * x + y * y)}},
            {}};
    }

    GltfTransform transformOf(GltfDocument const& document, Json const& node)
    {
        GltfTransform result;
        if (auto const matrix = findNumbers<16>(document, node, "matrix")) { // column by column
            for (std::size_t row = 0; row < 3; ++row) {
                for (std::size_t column = 0; column < 3; ++column)
                    result.linear[row][column] = (*matrix)[4 * column + row];
                result.translation[row] = (*matrix)[12 + row];
            }
            if ((*matrix)[3] != 0 || (*matrix)[7] != 0 || (*matrix)[11] != 0 || (*matrix)[15] != 1)
                document.refuse("the last row of matrix is not 0 0 0 1");
            return result;
        }
        if (auto const rotation = findNumbers<4>(document, node, "rotation"))
            result = rotationBy(*rotation);
        if (auto const scale = findNumbers<3>(document, node, "scale"))
            for (auto& row : result.linear)
                for (std::size_t column = 0; column < 3; ++column)
                    row[column] *= (*scale)[column];
        if (auto const translation = findNumbers<3>(document, node, "translation"))
            std::copy(translation->begin(), translation->end(), result.translation);
        return result;
    }

    /// The nodes to begin with.
    std::vector<std::uint64_t> rootsOf(GltfDocument& document)
    {
        auto const indicesIn = [&](Json const& parent, char const* name) {
            std::vector<std::uint64_t> indices;
            for (Json const& index : document.listIn(parent, name)) {
                if (!index.is_number_unsigned())
                    document.refuse(std::string(name) + " has an entry that is not an index");
                indices.push_back(index.get<std::uint64_t>());
            }
            return indices;
        };
        if (!document.list("scenes").empty()) {
            document.at("scene");
            return indicesIn(
                document.item("scenes", document.findNumber(document.root(), "scene").value_or(0)), "nodes");
        }
        std::vector<bool> isChild(document.list("nodes").size());
        for (std::uint64_t node = 0; node < isChild.size(); ++node) {
            document.at("node " + std::to_string(node));
            for (std::uint64_t const child : indicesIn(document.item("nodes", node), "children"))
                if (child < isChild.size())
                    isChild[child] = true;
        }
        std::vector<std::uint64_t> roots;
        for (std::uint64_t node = 0; node < isChild.size(); ++node)
            if (!isChild[node])
                roots.push_back(node);
        if (roots.empty() && !isChild.empty())
            document.refuse("every node is the child of a node, but nodes have to be trees");
        return roots;
    }

}

double GltfTransform::determinant() const
{
    auto const& a = linear;
    return a[0][0] * (a[1][1] * a[2][2] - a[1][2] * a[2][1]) - a[0][1] * (a[1][0] * a[2][2] - a[1][2] * a[2][0])
        + a[0][2] * (a[1][0] * a[2][1] - a[1][1] * a[2][0]);
}

GltfTransform GltfTransform::after(GltfTransform const& first) const
{
    GltfTransform result;
    for (std::size_t row = 0; row < 3; ++row) {
        result.translation[row] = translation[row];
        for (std::size_t column = 0; column < 3; ++column) {
            result.translation[row] += linear[row][column] * first.translation[column];
            result.linear[row][column] = linear[row][0] * first.linear[0][column]
                + linear[row][1] * first.linear[1][column] + linear[row][2] * first.linear[2][column];
        }
    }
    return result;
}

GltfTransform GltfTransform::forNormals() const
{
    GltfTransform result; // cofactors
    double const sign = determinant() < 0 ? -1 : 1;
    for (std::size_t row = 0; row < 3; ++row) {
        std::size_t const r1 = (row + 1) % 3, r2 = (row + 2) % 3;
        for (std::size_t column = 0; column < 3; ++column) {
            std::size_t const c1 = (column + 1) % 3, c2 = (column + 2) % 3;
            result.linear[row][column] = sign * (linear[r1][c1] * linear[r2][c2] - linear[r1][c2] * linear[r2][c1]);
        }
    }
    return result;
}

double3 GltfTransform::apply(double3 const& p) const
{
    auto const row = [&](std::size_t r) {
        return linear[r][0] * p.x + linear[r][1] * p.y + linear[r][2] * p.z + translation[r];
    };
    return {row(0), row(1), row(2)};
}

std::vector<GltfInstance> collectInstances(GltfDocument& document)
{
    struct Visit {
        std::uint64_t node;
        GltfTransform parent;
    };
    std::vector<GltfInstance> instances;
    if (document.list("nodes").empty()) {
        for (std::uint64_t mesh = 0; mesh < document.list("meshes").size(); ++mesh)
            instances.push_back({mesh, {}});
        return instances;
    }
    std::vector<Visit> open; // the next one is the last
    auto const openInOrder = [&](std::vector<std::uint64_t> const& nodes, GltfTransform const& parent) {
        for (auto node = nodes.rbegin(); node != nodes.rend(); ++node)
            open.push_back({*node, parent});
    };
    openInOrder(rootsOf(document), {});
    std::vector<bool> isVisited(document.list("nodes").size());
    while (!open.empty()) {
        Visit const visit = open.back();
        open.pop_back();
        document.at("node " + std::to_string(visit.node));
        Json const& node = document.item("nodes", visit.node);
        if (isVisited[visit.node])
            document.refuse("it occurs twice in the scene, which has to be a tree");
        isVisited[visit.node] = true;
        GltfTransform const transform = visit.parent.after(transformOf(document, node));
        if (auto const mesh = document.findNumber(node, "mesh")) {
            static_cast<void>(document.item("meshes", *mesh));
            instances.push_back({*mesh, transform});
        }
        std::vector<std::uint64_t> children;
        for (Json const& child : document.listIn(node, "children")) {
            if (!child.is_number_unsigned())
                document.refuse("children has an entry that is not an index");
            children.push_back(child.get<std::uint64_t>());
        }
        openInOrder(children, transform);
    }
    return instances;
}

}
