# The library exports exactly the operations, in the order of exports.txt.

execute_process(COMMAND ${NM} -D --defined-only --demangle --format=posix ${LIBRARY}
    OUTPUT_VARIABLE symbols COMMAND_ERROR_IS_FATAL ANY)
# A line is "name T address size"; names of functions hold blanks.
string(REGEX REPLACE " [A-Za-z] [0-9a-f]+( [0-9a-f]+)?\n" "\n" exported "${symbols}")
file(READ ${CMAKE_CURRENT_LIST_DIR}/exports.txt expected)
foreach(list exported expected)
    string(STRIP "${${list}}" ${list})
    string(REPLACE "\n" ";" ${list} "${${list}}")
    list(SORT ${list})
endforeach()
if(NOT exported STREQUAL expected)
    list(JOIN exported "\n  " exported)
    list(JOIN expected "\n  " expected)
    message(FATAL_ERROR "exported:\n  ${exported}\nexpected:\n  ${expected}")
endif()
