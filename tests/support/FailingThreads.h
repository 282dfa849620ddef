#pragma once

namespace TestSupport {

/// While one lives, the thread that made it can create no threads.
struct NoNewThreads {
    NoNewThreads();
    ~NoNewThreads();
};

}
