# Folders include one another only along the arrows that ARCHITECTURE.md draws.

cmake_minimum_required(VERSION 3.25)

# For each folder the folders that it may include besides itself; "top" is the tree's own folder.
set(src_top "")
set(src_frame host)
set(src_host frame)
foreach(subsystem cleanup editing merging stitch subdivision triangulation volume)
    set(src_${subsystem} frame host)
endforeach()

set(program_top commands files geometry shell)
set(program_commands top files geometry page repair shell)
set(program_page files geometry shell)
set(program_repair geometry frame)
set(program_geometry shell files frame) # the library's frame, for its lists of the corners at each point and its lanes
set(program_shell files)
set(program_files frame) # parallel loops and copies of arrays

set(python_src commands geometry shell files top) # of the program: recipes run its commands as steps

# Headers at the top of a tree that every folder may include.
set(common_headers Vectors.h)

# A public header belongs to the subsystem that has the source of its name. These have none, or another one.
set(owner_subdivisionSteps subdivision)
set(owner_detail/TileLayout volume)
set(owner_detail/VoxelSamplerState volume)
set(no_owner Export Modeling)
set(public_subdivision volume) # further subsystems whose public headers it may include

set(wrong)

function(reject file header)
    file(RELATIVE_PATH name ${SOURCE_DIR} ${file})
    set(wrong ${wrong} "${name} includes ${header}" PARENT_SCOPE)
endfunction()

# The names between the brackets or quotes, whichever are given.
function(read_includes file open close)
    file(STRINGS ${file} lines REGEX "^ *# *include *${open}")
    list(TRANSFORM lines REPLACE "^ *# *include *${open}([^${close}]*)${close}.*$" "\\1")
    set(includes ${lines} PARENT_SCOPE)
endfunction()

# The first folder of a path, "top" if there is none.
function(first_folder path result)
    set(${result} top PARENT_SCOPE)
    if(path MATCHES "^([^/]+)/")
        set(${result} ${CMAKE_MATCH_1} PARENT_SCOPE)
    endif()
endfunction()

function(owner_of header result)
    string(REGEX REPLACE "\\.h$" "" name ${header})
    file(GLOB source RELATIVE ${SOURCE_DIR}/src ${SOURCE_DIR}/src/*/${name}.cpp)
    if(DEFINED owner_${name})
        set(${result} ${owner_${name}} PARENT_SCOPE)
    elseif(source)
        first_folder(${source} folder)
        set(${result} ${folder} PARENT_SCOPE)
    elseif(name IN_LIST no_owner)
        set(${result} "" PARENT_SCOPE)
    else()
        message(FATAL_ERROR "no source in src/ tells to which subsystem include/Modeling/${header} belongs: "
            "add it to ${CMAKE_CURRENT_LIST_FILE}")
    endif()
endfunction()

# Quoted includes: relative to the file's own folder, or to the tree.
function(check_quoted tree file)
    file(RELATIVE_PATH path ${SOURCE_DIR}/${tree} ${file})
    first_folder(${path} folder)
    if(NOT DEFINED ${tree}_${folder})
        message(FATAL_ERROR "${tree}/${folder} has no entry in ${CMAKE_CURRENT_LIST_FILE}")
    endif()
    get_filename_component(directory ${file} DIRECTORY)
    read_includes(${file} "\"" "\"")
    foreach(header IN LISTS includes)
        set(target ${folder})
        if(NOT EXISTS ${directory}/${header} AND NOT header STREQUAL BuildInfo.h) # which the build writes
            first_folder(${header} target)
        endif()
        if(NOT target STREQUAL folder AND NOT target IN_LIST ${tree}_${folder} AND NOT header IN_LIST common_headers)
            reject(${file} ${header})
        endif()
    endforeach()
    set(wrong ${wrong} PARENT_SCOPE)
endfunction()

# Includes of public headers, by a source of subsystem `folder` or by another public header.
function(check_public folder file)
    read_includes(${file} "<" ">")
    list(FILTER includes INCLUDE REGEX "^Modeling/")
    foreach(header IN LISTS includes)
        string(REGEX REPLACE "^Modeling/" "" name ${header})
        owner_of(${name} owner)
        if(owner AND NOT owner STREQUAL folder AND NOT owner IN_LIST public_${folder})
            reject(${file} ${header})
        endif()
    endforeach()
    set(wrong ${wrong} PARENT_SCOPE)
endfunction()

foreach(tree src program python)
    file(GLOB_RECURSE files ${SOURCE_DIR}/${tree}/*.h ${SOURCE_DIR}/${tree}/*.cpp)
    list(FILTER files EXCLUDE REGEX "/python/(benchmarks|tests)/") # which may include anything
    foreach(file IN LISTS files)
        check_quoted(${tree} ${file})
        if(tree STREQUAL src)
            file(RELATIVE_PATH path ${SOURCE_DIR}/src ${file})
            first_folder(${path} folder)
            check_public(${folder} ${file})
        endif()
    endforeach()
endforeach()

file(GLOB_RECURSE headers RELATIVE ${SOURCE_DIR}/include/Modeling ${SOURCE_DIR}/include/Modeling/*.h)
list(REMOVE_ITEM headers Modeling.h) # includes all
foreach(header IN LISTS headers)
    owner_of(${header} owner)
    check_public("${owner}" ${SOURCE_DIR}/include/Modeling/${header})
    read_includes(${SOURCE_DIR}/include/Modeling/${header} "\"" "\"")
    foreach(quoted IN LISTS includes)
        reject(${SOURCE_DIR}/include/Modeling/${header} ${quoted})
    endforeach()
endforeach()

file(GLOB_RECURSE files ${SOURCE_DIR}/standins/*.h ${SOURCE_DIR}/standins/*.cpp)
foreach(file IN LISTS files)
    read_includes(${file} "<" ">")
    list(FILTER includes INCLUDE REGEX "^Modeling/")
    foreach(header IN LISTS includes)
        reject(${file} ${header})
    endforeach()
endforeach()

if(wrong)
    list(JOIN wrong "\n  " wrong)
    message(FATAL_ERROR "includes against the arrows of ARCHITECTURE.md:\n  ${wrong}")
endif()
