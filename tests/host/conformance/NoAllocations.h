#pragma once

namespace HostTests {

/// While it exists, `operator new` throws std::bad_alloc on this thread.
class NoAllocations {
public:
    NoAllocations();
    ~NoAllocations();
    NoAllocations(NoAllocations const&) = delete;
    NoAllocations& operator=(NoAllocations const&) = delete;
};

}
