# Writes the header with the build information of the version line:
#     cmake -DOUTPUT= -DSOURCE_DIR= -DVERSION= -DBUILD_NUMBER= -P <this>
# Commit and branch come from the checkout; outside of one they are "unknown". The date is that of SOURCE_DATE_EPOCH if it is
# set, otherwise today's.

function(ask_git result)
    set(${result} unknown PARENT_SCOPE)
    find_program(GIT git)
    # Only the project's own checkout counts, not one that happens to contain an unpacked archive.
    if(GIT AND EXISTS ${SOURCE_DIR}/.git)
        execute_process(COMMAND ${GIT} ${ARGN} WORKING_DIRECTORY ${SOURCE_DIR}
            OUTPUT_VARIABLE answer OUTPUT_STRIP_TRAILING_WHITESPACE ERROR_QUIET RESULT_VARIABLE failed)
        string(REGEX REPLACE "[^A-Za-z0-9._/+-]" "_" answer "${answer}") # a branch may be called anything
        if(NOT failed AND answer)
            set(${result} ${answer} PARENT_SCOPE)
        endif()
    endif()
endfunction()

ask_git(commit rev-parse HEAD)
ask_git(branch rev-parse --abbrev-ref HEAD)
string(TIMESTAMP date "%Y-%m-%d" UTC)

set(content "#pragma once

namespace Modeling::BuildInfo {

inline constexpr char const* kVersion = \"${VERSION}\";
inline constexpr char const* kBuildNumber = \"${BUILD_NUMBER}\";
inline constexpr char const* kDate = \"${date}\";
inline constexpr char const* kCommit = \"${commit}\";
inline constexpr char const* kBranch = \"${branch}\";

}
")
set(present "")
if(EXISTS ${OUTPUT})
    file(READ ${OUTPUT} present)
endif()
if(NOT content STREQUAL present)
    file(WRITE ${OUTPUT} "${content}")
endif()
