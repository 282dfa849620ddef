#include "BuildInfo.h"

#include <cstdio>
#include <cstdlib>

#include <fcntl.h>
#include <unistd.h>

namespace Modeling {

namespace {

    bool isVersionLineRequested()
    {
        char const* const setting = std::getenv("ZEPHRAN_DUMP_VERSION_INFO");
        bool const isOn = setting && std::strtol(setting, nullptr, 10) != 0;
        return isOn && ::fcntl(STDERR_FILENO, F_GETFD) != -1; // standard error may be closed
    }

    bool writeVersionLine()
    {
        bool const isRequested = isVersionLineRequested();
        if (isRequested)
            std::fprintf(stderr, "%16s: Tessara version %s (%s, build %s, commit %.7s, branch %s)\n", "Modeling",
                BuildInfo::kVersion, BuildInfo::kDate, BuildInfo::kBuildNumber, BuildInfo::kCommit, BuildInfo::kBranch);
        return isRequested;
    }

    // Written when the library is loaded: the line tells support which build a host is using.
    [[maybe_unused]] bool const hasWrittenVersionLine = writeVersionLine();

}

}
