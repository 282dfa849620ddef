#pragma once

namespace TestSupport {

/// While one is alive, the thread that made it cannot create threads.
struct NoNewThreads {
    NoNewThreads();
    ~NoNewThreads();
};

}
