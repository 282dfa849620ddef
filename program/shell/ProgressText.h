#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace ModelingProgram {

/// What is shown of a phase.
struct PhaseProgress {
    std::string title;
    char const* unit = nullptr; // null if nothing is counted
    std::uint64_t done = 0;
    std::uint64_t total = 0; // 0 if unknown
    double seconds = 0; // since the phase began
    double rate = 0; // units per second, of late; 0 if unknown
    unsigned int number = 0; // of the phase; 0 if there was none yet
};

/// "reading a.ply: 45 %, 3 s left, 310.0 MB/s"
std::string progressLine(PhaseProgress const& phase);

/// The same with a bar, in fewer than `columns` columns: parts that do not fit are left out.
std::string progressBar(PhaseProgress const& phase, std::size_t columns, bool isColored);

}
