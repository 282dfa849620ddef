#pragma once

#include "geometry/GuideGrid.h"

#include <memory>

namespace ModelingPython {

/// What the Python class `Guide` holds. It does not change, and any number of threads may read it.
class Guide {
public:
    explicit Guide(ModelingProgram::GuideGrid grid)
        : grid_(std::make_shared<ModelingProgram::GuideGrid const>(std::move(grid)))
    {
    }

    ModelingProgram::GuideGrid const& grid() const { return *grid_; }

private:
    std::shared_ptr<ModelingProgram::GuideGrid const> grid_;
};

}
