# The library exports exactly the operations, and requires nothing of the host's libraries that is not listed.

# The demangled names that nm lists, and those in a file of this folder.
function(read_names what pattern list_file)
    execute_process(COMMAND ${NM} -D --${what}-only --demangle --format=posix ${LIBRARY}
        OUTPUT_VARIABLE symbols COMMAND_ERROR_IS_FATAL ANY)
    file(READ ${CMAKE_CURRENT_LIST_DIR}/${list_file} expected)
    foreach(list symbols expected)
        string(STRIP "${${list}}" ${list})
        string(REPLACE "\n" ";" ${list} "${${list}}")
    endforeach()
    list(FILTER symbols INCLUDE REGEX "${pattern}")
    # A line is "name T address size", "name U" where it is undefined; function names contain blanks.
    list(TRANSFORM symbols REPLACE " [A-Za-z]( [0-9a-f]+)?( [0-9a-f]+)? *$" "")
    set(symbols "${symbols}" PARENT_SCOPE)
    set(expected "${expected}" PARENT_SCOPE)
endfunction()

function(require_none what)
    if(ARGN)
        list(JOIN ARGN "\n  " names)
        message(FATAL_ERROR "${what}:\n  ${names}")
    endif()
endfunction()

read_names(defined "." exports.txt)
set(unlisted ${symbols})
list(REMOVE_ITEM unlisted ${expected})
require_none("exported, but not listed in exports.txt" ${unlisted})
list(REMOVE_ITEM expected ${symbols})
require_none("listed in exports.txt, but not exported" ${expected})

# Compilers inline differently, so not every build asks for all of them.
read_names(undefined "^(void )?(Orvan|Tessara|TSR|CoreGL)::" hostSymbols.txt)
list(REMOVE_ITEM symbols ${expected})
require_none("asked of the host, but not listed in hostSymbols.txt" ${symbols})
