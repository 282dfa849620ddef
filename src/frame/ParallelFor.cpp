#include "ParallelFor.h"

#include <OrvanCppOpSDK/Job.h>
#include <TessaraMathSupport/ExceptionMessage.h>

#include <tbb/parallel_for.h>
#include <tbb/partitioner.h>

#include <stdexcept>

namespace Modeling::Internal {

void runLoop(tbb::blocked_range<std::size_t> const& range, LoopBody const& body, bool isolated)
{
    tbb::task_group_context context(isolated ? tbb::task_group_context::isolated : tbb::task_group_context::bound);
    tbb::parallel_for(
        range, [&body](auto const& part) { body.run(body.body, part.begin(), part.end()); }, tbb::auto_partitioner(),
        context);
    if (!isolated && Orvan::isJobCancelled())
        throw std::runtime_error(TSR::exceptionMessage.c_str());
}

}
