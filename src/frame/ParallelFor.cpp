#include "ParallelFor.h"

#include <OrvanCppOpSDK/Job.h>
#include <TessaraMathSupport/ExceptionMessage.h>

#include <tbb/parallel_for.h>
#include <tbb/partitioner.h>

#include <exception>
#include <new>
#include <stdexcept>

namespace Modeling::Internal {

namespace {

    /// Calls a loop's body and keeps the first exception. oneTBB allocates for an exception that reaches it, and
    /// terminates the process if it cannot.
    class Calls {
    public:
        Calls(LoopBody const& body, tbb::task_group_context& context)
            : body_(body)
            , context_(context)
        {
        }

        void make(std::size_t begin, std::size_t end)
        {
            if (!hasBegun_.load(std::memory_order_relaxed))
                hasBegun_.store(true, std::memory_order_relaxed);
            try {
                body_.run(body_.body, begin, end);
            } catch (...) {
                if (!hasFailed_.exchange(true))
                    failure_ = std::current_exception();
                context_.cancel_group_execution();
            }
        }

        // To be called after the loop.

        bool hasBegun() const { return hasBegun_; }

        void rethrow() const
        {
            if (failure_)
                std::rethrow_exception(failure_);
        }

    private:
        LoopBody const& body_;
        tbb::task_group_context& context_;
        std::atomic<bool> hasBegun_ = false;
        std::atomic<bool> hasFailed_ = false;
        std::exception_ptr failure_;
    };

}

void runLoop(tbb::blocked_range<std::size_t> const& range, LoopBody const& body, bool isolated)
{
    tbb::task_group_context context(isolated ? tbb::task_group_context::isolated : tbb::task_group_context::bound);
    Calls calls(body, context);
    try {
        tbb::parallel_for(
            range, [&calls](auto const& part) { calls.make(part.begin(), part.end()); }, tbb::auto_partitioner(),
            context);
    } catch (...) { // of oneTBB itself: std::bad_alloc, or std::runtime_error if no thread can be created
        calls.rethrow();
        if (calls.hasBegun())
            throw std::bad_alloc();
        calls.make(range.begin(), range.end());
    }
    calls.rethrow();
}

void throwIfJobIsCancelled()
{
    if (Orvan::isJobCancelled())
        throw std::runtime_error(TSR::exceptionMessage.c_str());
}

}
