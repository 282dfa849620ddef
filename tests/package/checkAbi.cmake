# The binary interface of the library is the one that libModeling.abi describes, so that programs that were linked with an
# earlier version still run. Described are the exported functions and the types in include/Modeling. Types of the host, of the
# standard library and of oneTBB are opaque: whoever provides them keeps them compatible. Where ours contain them, their size
# counts as a part of ours.

set(description ${SOURCE_DIR}/tests/package/libModeling.abi)
set(current ${BUILD_DIR}/package-test/libModeling.abi)
if(UPDATE)
    set(current ${description})
endif()

# No paths and no places in files, which differ between machines.
execute_process(COMMAND ${ABIDW} --headers-dir ${SOURCE_DIR}/include/Modeling --drop-private-types --drop-undefined-syms
        --suppressions ${CMAKE_CURRENT_LIST_DIR}/abi.suppressions
        --exported-interfaces-only --no-corpus-path --no-comp-dir-path --no-show-locs --no-parameter-names --no-elf-needed
        --no-write-default-sizes --type-id-style hash --out-file ${current} ${LIBRARY}
    COMMAND_ERROR_IS_FATAL ANY)
file(READ ${current} text)
string(REGEX REPLACE "(<abi-instr[^>]*) path='[^']*'" "\\1" text "${text}")
file(WRITE ${current} "${text}")
if(UPDATE)
    return()
endif()

set(update "record the new interface with `cmake --build ${BUILD_DIR} --target update_abi`, and commit it")
set(breaks "The binary interface has changed: programs that are linked with the present libModeling.so.${SOVERSION} can fail or crash \
with this one. Undo the change, or raise the major version in CMakeLists.txt, which is the SOVERSION, and ${update}")
set(adds "The library has something new, which breaks no program. Raise the minor version in CMakeLists.txt, unless that has been \
done since the last release, and ${update}")

function(compare advice)
    execute_process(COMMAND ${ABIDIFF} ${ARGN} ${description} ${current}
        OUTPUT_VARIABLE report ERROR_VARIABLE report RESULT_VARIABLE changes)
    if(changes)
        message(FATAL_ERROR "${advice}.\n${report}")
    endif()
endfunction()

# Sizes of types and places of members. abidiff leaves out types that only inline functions use.
function(read_layout file result)
    file(READ ${file} text)
    string(REPLACE ";" "" text "${text}")
    string(REGEX MATCHALL
        "<class-decl name='[^']*' size-in-bits='[0-9]+'|layout-offset-in-bits='[0-9]+'>[^<]*<var-decl name='[^']*' type-id='[^']*'"
        layout "${text}")
    set(${result} "${layout}" PARENT_SCOPE)
endfunction()

function(require_none advice)
    if(ARGN)
        list(JOIN ARGN "\n" changes)
        message(FATAL_ERROR "${advice}.\n${changes}")
    endif()
endfunction()

compare("${breaks}" --no-added-syms)
read_layout(${description} described)
read_layout(${current} present)
set(missing ${described})
list(REMOVE_ITEM missing ${present})
require_none("${breaks}" ${missing})
compare("${adds}")
list(REMOVE_ITEM present ${described})
require_none("${adds}" ${present})
