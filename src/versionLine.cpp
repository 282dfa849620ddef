#include "BuildInfo.h"

#include <cstdio>
#include <cstdlib>

#include <fcntl.h>
#include <unistd.h>

namespace Modeling {

namespace {

    bool isVersionLineWanted()
    {
        char const* const wish = std::getenv("ZEPHRAN_DUMP_VERSION_INFO");
        bool const isOn = wish && std::strtol(wish, nullptr, 10) != 0;
        return isOn && ::fcntl(STDERR_FILENO, F_GETFD) != -1; // standard error may be closed, or another file by now
    }

    bool writeVersionLine()
    {
        bool const isWanted = isVersionLineWanted();
        if (isWanted)
            std::fprintf(stderr, "%16s: Tessara version %s (%s, build %s, commit %.7s, branch %s)\n", "Modeling",
                BuildInfo::kVersion, BuildInfo::kDate, BuildInfo::kBuildNumber, BuildInfo::kCommit, BuildInfo::kBranch);
        return isWanted;
    }

    // Once, when the library is loaded: support asks for this line to tell which build a host has taken.
    [[maybe_unused]] bool const hasWrittenVersionLine = writeVersionLine();

}

}
