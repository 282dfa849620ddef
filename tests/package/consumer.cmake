# Configures, builds and runs the outside project in `consumer` against packages installed below the given prefixes.

function(run)
    execute_process(COMMAND ${ARGN} OUTPUT_VARIABLE output ERROR_VARIABLE output RESULT_VARIABLE failed)
    if(failed)
        list(JOIN ARGN " " command)
        message(FATAL_ERROR "${command}\n${output}")
    endif()
    set(output "${output}" PARENT_SCOPE)
endfunction()

set(flags -G Ninja -DCMAKE_CXX_COMPILER=${CXX_COMPILER} -DCMAKE_BUILD_TYPE=${BUILD_TYPE} -DTBB_DIR=${TBB_DIR})
if(SANITIZE)
    list(APPEND flags -DCMAKE_CXX_FLAGS=-fsanitize=${SANITIZE})
endif()

# `library_path` is where a host that is installed elsewhere has its libraries; empty when all stand in one place.
function(run_consumer folder library_path)
    list(JOIN ARGN ":" prefixes)
    run(${CMAKE_COMMAND} -E env CMAKE_PREFIX_PATH=${prefixes}
        ${CMAKE_COMMAND} -S ${CMAKE_CURRENT_LIST_DIR}/consumer -B ${folder} ${flags})
    run(${CMAKE_COMMAND} --build ${folder})
    run(${CMAKE_COMMAND} -E env LD_LIBRARY_PATH=${library_path} ${folder}/consumer)
    if(NOT output MATCHES "6 points, 8 faces")
        message(FATAL_ERROR "the consumer said: ${output}")
    endif()
endfunction()
