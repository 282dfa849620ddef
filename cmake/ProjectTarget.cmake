# What every target of this project has in common.

include_guard()
include(${CMAKE_CURRENT_LIST_DIR}/Hardening.cmake)

add_library(modeling_flags INTERFACE)
target_link_libraries(modeling_flags INTERFACE modeling_hardening)
target_compile_features(modeling_flags INTERFACE cxx_std_20)
target_compile_options(modeling_flags INTERFACE
    # Fused multiply-adds round differently: results would depend on the compiler and the machine.
    -ffp-contract=off
    # Square roots that do not set errno can be vectorized; their values are the same.
    -fno-math-errno
    -Wall -Wextra -Wpedantic -Wshadow -Wconversion -Wnon-virtual-dtor -Woverloaded-virtual)
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND CMAKE_CXX_COMPILER_VERSION VERSION_LESS 13)
    target_compile_options(modeling_flags INTERFACE -Wno-restrict) # g++ 12 reports false overlaps in std::string
endif()
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
    # If sources are compiled together, their unnamed namespaces are taken for those of a header.
    target_compile_options(modeling_flags INTERFACE -Wno-subobject-linkage)
endif()
if(MODELING_WARNINGS_AS_ERRORS)
    target_compile_options(modeling_flags INTERFACE -Werror)
endif()
# Whether memory is allocated by a sanitizer. Compilers tell it in different ways.
set(is_sanitized 0)
if(MODELING_SANITIZE MATCHES "address|thread")
    set(is_sanitized 1)
endif()
target_compile_definitions(modeling_flags INTERFACE MODELING_IS_SANITIZED=${is_sanitized})
if(MODELING_SANITIZE)
    target_compile_options(modeling_flags INTERFACE -fsanitize=${MODELING_SANITIZE} -fno-omit-frame-pointer)
    target_link_options(modeling_flags INTERFACE -fsanitize=${MODELING_SANITIZE})
    if(MODELING_SANITIZE MATCHES "undefined")
        target_compile_options(modeling_flags INTERFACE -fno-sanitize-recover=undefined)
        if(CMAKE_CXX_COMPILER_ID STREQUAL "Clang")
            target_compile_options(modeling_flags INTERFACE
                -fsanitize-ignorelist=${PROJECT_SOURCE_DIR}/cmake/sanitizers.ignore)
        endif()
    endif()
endif()

# Gives a target the project's language level, warnings, sanitizers and hardening. Only the language level propagates to its users.
function(modeling_use_flags target)
    target_link_libraries(${target} PRIVATE $<BUILD_INTERFACE:modeling_flags>)
    target_compile_features(${target} PUBLIC cxx_std_20)
    set_target_properties(${target} PROPERTIES CXX_EXTENSIONS OFF)
endfunction()

# For code of tests: the code under test is in libraries, and what tests do themselves takes longer to optimize than to run.
function(modeling_compile_quickly target)
    if(MODELING_SANITIZE)
        target_compile_options(${target} PRIVATE -O0)
    else()
        target_compile_options(${target} PRIVATE $<$<CONFIG:Release>:-O1>)
    endif()
endfunction()

# Adds a test program from SOURCES and LIBRARIES. Each gtest case becomes a CTest test, with PREFIX before its name. The target
# tests_<LABEL> builds all programs of a label.
function(modeling_add_test name)
    cmake_parse_arguments(arg "" "LABEL;PREFIX" "SOURCES;LIBRARIES" ${ARGN})
    add_executable(${name} ${arg_SOURCES})
    modeling_use_flags(${name})
    modeling_compile_quickly(${name})
    set_target_properties(${name} PROPERTIES UNITY_BUILD ON) # in all presets: they take longest to compile
    target_link_libraries(${name} PRIVATE ${arg_LIBRARIES} GTest::gmock GTest::gtest_main)
    if(NOT TARGET tests_${arg_LABEL})
        add_custom_target(tests_${arg_LABEL})
    endif()
    add_dependencies(tests_${arg_LABEL} ${name})
    gtest_discover_tests(${name} TEST_PREFIX "${arg_PREFIX}" DISCOVERY_TIMEOUT 60 PROPERTIES LABELS "${arg_LABEL}" TIMEOUT 600)
endfunction()
