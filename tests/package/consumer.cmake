# Builds and runs the README's example program against packages installed below the given prefixes.

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

# Writes the only block of that language in a Markdown text to a file.
function(write_block language text file)
    string(REGEX MATCHALL "\n```${language}\n" starts "${text}")
    list(LENGTH starts count)
    if(NOT count EQUAL 1)
        message(FATAL_ERROR "the README has ${count} blocks of ${language}, not one")
    endif()
    string(FIND "${text}" "\n```${language}\n" start)
    string(SUBSTRING "${text}" ${start} -1 text)
    string(REGEX REPLACE "^\n```[a-z]+\n" "" text "${text}")
    string(FIND "${text}" "```" end)
    string(SUBSTRING "${text}" 0 ${end} text)
    file(WRITE ${file} "${text}")
endfunction()

# Runs the README's example program.
function(run_program)
    run(${ARGN})
    if(NOT output MATCHES "6 points, 8 faces")
        message(FATAL_ERROR "the program said: ${output}")
    endif()
endfunction()

# The README and the other documents are those installed below the first prefix. `library_path` is where a host that is
# installed elsewhere has its libraries; empty if everything is in one place.
function(run_consumer folder library_path)
    list(GET ARGN 0 prefix)
    foreach(document LICENSE README.md CHANGELOG.md)
        run(${CMAKE_COMMAND} -E compare_files ${SOURCE_DIR}/${document} ${prefix}/share/doc/Modeling/${document})
    endforeach()
    file(READ ${prefix}/share/doc/Modeling/README.md readme)
    write_block(cmake "${readme}" ${folder}/CMakeLists.txt)
    write_block(cpp "${readme}" ${folder}/main.cpp)

    list(JOIN ARGN ":" prefixes)
    run(${CMAKE_COMMAND} -E env CMAKE_PREFIX_PATH=${prefixes} ${CMAKE_COMMAND} -S ${folder} -B ${folder}/build ${flags})
    run(${CMAKE_COMMAND} --build ${folder}/build)
    run_program(${CMAKE_COMMAND} -E env LD_LIBRARY_PATH=${library_path} ${folder}/build/app)
endfunction()
