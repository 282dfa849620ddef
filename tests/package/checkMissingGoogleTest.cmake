# Without GoogleTest everything else can be built, unless tests are requested.

set(folder ${BUILD_DIR}/package-test/without-googletest)
function(configure)
    file(REMOVE_RECURSE ${folder})
    execute_process(COMMAND ${CMAKE_COMMAND} -S ${SOURCE_DIR} -B ${folder} -G Ninja -DCMAKE_CXX_COMPILER=${CXX_COMPILER}
            -DTBB_DIR=${TBB_DIR} -DCMAKE_DISABLE_FIND_PACKAGE_GTest=ON ${ARGN}
        OUTPUT_VARIABLE output ERROR_VARIABLE output RESULT_VARIABLE failed)
    set(output "${output}" PARENT_SCOPE)
    set(failed "${failed}" PARENT_SCOPE)
endfunction()

configure()
if(failed OR NOT output MATCHES "Tests are not built[^\n]* GoogleTest")
    message(FATAL_ERROR "by default:\n${output}")
endif()
configure(-DMODELING_BUILD_TESTS=ON)
if(NOT failed OR NOT output MATCHES "MODELING_BUILD_TESTS is ON[^\n]*\n? *[^\n]* GoogleTest")
    message(FATAL_ERROR "with MODELING_BUILD_TESTS=ON:\n${output}")
endif()
