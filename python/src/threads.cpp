#include "Bindings.h"
#include "Creation.h"

#include <tbb/global_control.h>
#include <tbb/info.h>

#include <optional>
#include <string>

namespace ModelingPython {

namespace {

    namespace py = pybind11;

    /// Limits the threads of all operations while it is entered.
    class Threads {
    public:
        explicit Threads(py::ssize_t count)
            : count_(count)
        {
            if (count < 1)
                throw py::value_error("threads needs a number from 1, not " + std::to_string(count));
        }

        Threads& enter()
        {
            if (limit_)
                throw std::runtime_error("this limit of threads is already in force");
            limit_.emplace(tbb::global_control::max_allowed_parallelism, static_cast<std::size_t>(count_));
            return *this;
        }
        void exit() { limit_.reset(); }

    private:
        py::ssize_t count_;
        std::optional<tbb::global_control> limit_;
    };

    constexpr char kDoc[] =
        R"(Limits the threads that operations use, in the whole process: `with modeling.threads(2):`.

Results do not depend on the number of threads. Of several limits in force, the lowest counts.)";

    std::unique_ptr<Threads> makeThreads(py::ssize_t count)
    {
        return std::make_unique<Threads>(count);
    }

}

void bindThreads(py::module_& module)
{
    py::class_<Threads> threads(module, "threads", kDoc);
    defineCreation(threads, &makeThreads, py::arg("count"));
    threads.def("__enter__", &Threads::enter, py::return_value_policy::reference_internal)
        .def("__exit__", [](Threads& limit, py::args const&) { limit.exit(); });
    module.def(
        "thread_count", [] { return tbb::global_control::active_value(tbb::global_control::max_allowed_parallelism); },
        "The number of threads that operations may use now.");
}

}
