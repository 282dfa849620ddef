#include "repairMesh.h"

#include "dropFaces.h"
#include "joinSides.h"
#include "orientFaces.h"
#include "splitPoints.h"
#include "weldPoints.h"

#include <algorithm>
#include <optional>

namespace ModelingProgram {

namespace {

    class Repair {
    public:
        Repair(RepairOptions const& options, Tessara::Object const& mesh)
            : options_(options)
            , steps_(options.steps)
            , mesh_(mesh)
        {
        }

        void cleanElements()
        {
            if (steps_.weld)
                counts_.weldedPoints = weldPoints(options_.weldDistance, mesh_);
            if (steps_.degenerate) {
                DegenerateFaces const faces = dropDegenerateFaces(mesh_);
                counts_.degenerateFaces = faces.droppedCount;
                counts_.shortenedFaces = faces.shortenedCount;
            }
            if (steps_.doubled) {
                DoubledFaces faces = dropDoubledFaces(mesh_);
                counts_.doubledFaces = faces.droppedCount;
                twins_ = std::move(faces.twins);
            }
        }

        void connectFaces()
        {
            if (!steps_.orient && !steps_.fill && !steps_.split && twins_.empty())
                return;
            joinAndOrient();
            if (unsigned int const count = dropCopiedSheets(twins_, *adjacency_, mesh_); count != 0) {
                counts_.doubledFaces += count;
                joinAndOrient();
            }
        }

        /// Cutting edges opens the surface there, and filling may close it again.
        void closeSurface()
        {
            if (!steps_.fill && !steps_.split)
                return;
            constexpr int kMostRounds = 3;
            for (int round = 0; round != kMostRounds; ++round) {
                if (steps_.fill)
                    fill();
                if (!steps_.split)
                    return;
                counts_.splitPoints += splitPoints(mesh_, *adjacency_);
                if (!mayHaveCrowdedEdges_ || cutCrowdedEdges(mesh_, *adjacency_) == 0)
                    return;
                counts_.splitPoints += splitPoints(mesh_, *adjacency_);
                adjacency_.emplace(mesh_.arrays);
                joinTwoSided(mesh_.arrays, *adjacency_);
            }
        }

        RepairCounts finish(Tessara::Object& object)
        {
            if (steps_.orient)
                turnOutward(mesh_, *adjacency_);
            counts_.flippedFaces =
                static_cast<unsigned int>(std::count(mesh_.isFlipped.begin(), mesh_.isFlipped.end(), true));
            counts_.lossyProperties = propertiesWithLosses(mesh_.keptPoint, object);
            counts_.unusedPoints = applyRepair(std::move(mesh_), steps_.unused, object);
            return counts_;
        }

    private:
        void joinAndOrient()
        {
            counts_.conflictingEdges = 0;
            adjacency_.emplace(mesh_.arrays);
            NonManifoldEdges const edges = joinTwoSided(mesh_.arrays, *adjacency_);
            bool const hasNonManifoldEdges = edges.count() != 0;
            mayHaveCrowdedEdges_ = hasNonManifoldEdges;
            Orientation orientation;
            if (steps_.orient)
                orientation = orientSheets(mesh_.arrays, *adjacency_);
            if (hasNonManifoldEdges) {
                orientation.isFlipped.resize(mesh_.arrays.faceCount(), 0);
                joinNonManifold(mesh_.arrays, edges, orientation.isFlipped, *adjacency_);
                if (steps_.orient)
                    orientation = orientSheets(mesh_.arrays, *adjacency_);
            }
            if (!steps_.orient)
                return;
            for (unsigned int const side : orientation.conflicts)
                if (adjacency_->isJoined(side)) {
                    adjacency_->cut(side);
                    ++counts_.conflictingEdges;
                    mayHaveCrowdedEdges_ = true; // if both of its sides are filled
                }
            flipFaces(orientation.isFlipped, mesh_, *adjacency_);
        }

        void fill()
        {
            unsigned int const oldCount = mesh_.arrays.faceCount();
            FilledHoles const filled = fillHoles(options_.mostHoleEdges, mesh_, *adjacency_);
            for (unsigned int face = oldCount; face != mesh_.arrays.faceCount(); ++face)
                counts_.filledArea += length(areaVector(mesh_.arrays.corners(face), mesh_.arrays.positions->data)) / 2;
            FilledHoles& holes = counts_.holes;
            holes.filledCount += filled.filledCount;
            holes.faceCount += filled.faceCount;
            holes.centerCount += filled.centerCount;
            holes.longestFilled = std::max(holes.longestFilled, filled.longestFilled);
            holes.closedSlits += filled.closedSlits;
            holes.openCount = filled.openCount;
            holes.longestOpen = filled.longestOpen;
            holes.looseFaces = filled.looseFaces;
        }

        RepairOptions const& options_;
        RepairSteps const& steps_;
        MeshWithSources mesh_;
        std::vector<Twins> twins_;
        std::optional<Adjacency> adjacency_; // of the mesh, once its faces are connected
        bool mayHaveCrowdedEdges_ = false;
        RepairCounts counts_;
    };

}

RepairCounts repairMesh(RepairOptions const& options, Tessara::Object& mesh)
{
    Repair repair(options, mesh);
    repair.cleanElements();
    repair.connectFaces();
    repair.closeSurface();
    return repair.finish(mesh);
}

}
