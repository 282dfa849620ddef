# Decides whether tests are built. By default they are, unless the project is part of another one or a dependency of the
# tests is not installed. If MODELING_BUILD_TESTS is set to ON, as the presets do, anything missing is an error: no test is
# dropped silently.

set(wanted ${PROJECT_IS_TOP_LEVEL})
if(DEFINED MODELING_BUILD_TESTS)
    set(wanted ${MODELING_BUILD_TESTS})
endif()
if(NOT wanted)
    option(MODELING_BUILD_TESTS "Build the tests" OFF)
    return()
endif()

find_package(GTest QUIET)
set(missing)
if(NOT TARGET GTest::gtest_main OR NOT TARGET GTest::gmock)
    list(APPEND missing "GoogleTest with GoogleMock")
endif()
if(MODELING_BUILD_PROGRAM)
    find_path(TINYOBJLOADER_INCLUDE_DIR tiny_obj_loader.h)
    mark_as_advanced(TINYOBJLOADER_INCLUDE_DIR)
    if(NOT TINYOBJLOADER_INCLUDE_DIR)
        list(APPEND missing tinyobjloader)
    endif()
endif()
list(JOIN missing ", " missing)

if(missing AND MODELING_BUILD_TESTS)
    message(FATAL_ERROR "MODELING_BUILD_TESTS is ON, but the tests need what is not installed: ${missing}.\n"
        "On Debian: apt-get install libgtest-dev libgmock-dev libtinyobjloader-dev")
elseif(missing)
    message(STATUS "Tests are not built, as they need what is not installed: ${missing}")
    set(MODELING_BUILD_TESTS OFF) # not cached, so that the next run finds what is installed by then
    return()
endif()
option(MODELING_BUILD_TESTS "Build the tests" ON)
enable_testing()
include(GoogleTest)
