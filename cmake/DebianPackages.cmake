# The Debian packages that `cpack` makes in a build directory of scripts/package: one per component of the installation.

find_program(GZIP gzip REQUIRED)
mark_as_advanced(GZIP)

set(files ${PROJECT_BINARY_DIR}/packaging)
set(CPACK_PACKAGE_VERSION ${PROJECT_VERSION_MAJOR}.${PROJECT_VERSION_MINOR}.${PROJECT_VERSION_PATCH})
set(CPACK_DEBIAN_PACKAGE_RELEASE 1)
set(full_version ${CPACK_PACKAGE_VERSION}-${CPACK_DEBIAN_PACKAGE_RELEASE})

# The maintainer's name and address, as the tools of Debian take them from the environment.
set(maintainer "The Modeling authors <maintainers@modeling.invalid>")
if(DEFINED ENV{DEBFULLNAME} AND DEFINED ENV{DEBEMAIL})
    set(maintainer "$ENV{DEBFULLNAME} <$ENV{DEBEMAIL}>")
endif()

# Documents that Debian requires in each package.
string(TIMESTAMP date "%a, %d %b %Y %H:%M:%S +0000" UTC)
file(WRITE ${files}/changelog.Debian "modeling (${full_version}) unstable; urgency=medium

  * The changes of this version are in changelog.gz.

 -- ${maintainer}  ${date}
")
set(compressed)
function(compress source name)
    add_custom_command(OUTPUT ${files}/${name}
        COMMAND ${GZIP} -9nc ${source} > ${files}/${name}
        DEPENDS ${source} VERBATIM)
    set(compressed ${compressed} ${files}/${name} PARENT_SCOPE)
endfunction()
compress(${files}/changelog.Debian changelog.Debian.gz)
compress(${PROJECT_SOURCE_DIR}/CHANGELOG.md changelog.gz)
compress(${PROJECT_BINARY_DIR}/program/help/modeling.1 modeling.1.gz)
add_custom_target(ModelingPackageFiles ALL DEPENDS ${compressed})
add_dependencies(ModelingPackageFiles modeling) # which writes its manual page
install(FILES ${files}/modeling.1.gz COMPONENT Program DESTINATION ${CMAKE_INSTALL_MANDIR}/man1)
install(FILES README.md COMPONENT Program DESTINATION ${MODELING_DOC_DIR})

# add_package(component name SECTION SUMMARY TEXT DEPENDS LIBRARIES): LIBRARIES are those of which other packages are told that
# this one has them; DEPENDS, other packages of this project, in exactly this version.
macro(add_package component name)
    cmake_parse_arguments(arg "" "SECTION;SUMMARY;TEXT;FURTHER_DEPENDS;RECOMMENDS;SUGGESTS" "DEPENDS;LIBRARIES" ${ARGN})
    string(TOUPPER ${component} upper)
    list(APPEND CPACK_COMPONENTS_ALL ${component})
    set(CPACK_DEBIAN_${upper}_PACKAGE_NAME ${name})
    set(CPACK_DEBIAN_${upper}_PACKAGE_SECTION ${arg_SECTION})
    set(CPACK_DEBIAN_${upper}_DESCRIPTION "${arg_SUMMARY}\n${arg_TEXT}")
    set(CPACK_DEBIAN_${upper}_PACKAGE_RECOMMENDS "${arg_RECOMMENDS}")
    set(CPACK_DEBIAN_${upper}_PACKAGE_SUGGESTS "${arg_SUGGESTS}")
    list(TRANSFORM arg_DEPENDS APPEND " (= ${full_version})")
    list(APPEND arg_DEPENDS ${arg_FURTHER_DEPENDS})
    list(JOIN arg_DEPENDS ", " CPACK_DEBIAN_${upper}_PACKAGE_DEPENDS)

    set(control)
    if(arg_LIBRARIES)
        # What is linked with a minor version does not run with an older one, which may lack operations.
        list(TRANSFORM arg_LIBRARIES APPEND
            " ${name} (>= ${PROJECT_VERSION_MAJOR}.${PROJECT_VERSION_MINOR})" OUTPUT_VARIABLE lines)
        list(JOIN lines "\n" lines)
        file(WRITE ${files}/${name}/shlibs "${lines}\n")
        file(WRITE ${files}/${name}/triggers "activate-noawait ldconfig\n")
        # The trigger updates the loader's cache. Naming scripts that do not exist keeps CPack from adding its own for that.
        list(APPEND control ${files}/${name}/shlibs ${files}/${name}/triggers ${files}/none/postinst ${files}/none/postrm)
    endif()
    foreach(script postinst prerm)
        if(EXISTS ${PROJECT_SOURCE_DIR}/packaging/${name}.${script})
            configure_file(${PROJECT_SOURCE_DIR}/packaging/${name}.${script} ${files}/${name}/${script} COPYONLY)
            list(APPEND control ${files}/${name}/${script})
        endif()
    endforeach()
    set(CPACK_DEBIAN_${upper}_PACKAGE_CONTROL_EXTRA "${control}")

    install(FILES packaging/copyright ${files}/changelog.gz ${files}/changelog.Debian.gz COMPONENT ${component}
        DESTINATION ${CMAKE_INSTALL_DATADIR}/doc/${name})
endmacro()

set(CPACK_COMPONENTS_ALL)
set(host_package)
set(host_development_package)
if(MODELING_HOST STREQUAL "standin")
    set(host_package libtessara-standins1)
    set(host_development_package libtessara-standins-dev)
    get_property(host_libraries GLOBAL PROPERTY MODELING_HOST_LIBRARIES)
    list(TRANSFORM host_libraries PREPEND "lib")
    list(TRANSFORM host_libraries APPEND " 1")
    add_package(TessaraHost ${host_package}
        SECTION libs
        SUMMARY "stand-ins for the libraries of the host of Modeling"
        TEXT "Geometry objects and their properties, sparse volumes, jobs and logging, as
the operations of Modeling need them. A host application brings libraries of
its own in their place."
        LIBRARIES ${host_libraries})
    add_package(TessaraHostDevelopment ${host_development_package}
        SECTION libdevel
        SUMMARY "headers of the stand-ins for the libraries of the host of Modeling"
        TEXT "With the CMake package TessaraHost and the file tessarahost.pc for pkg-config."
        DEPENDS ${host_package})
endif()
add_package(Modeling libmodeling${PROJECT_VERSION_MAJOR}
    SECTION libs
    SUMMARY "geometry algorithms for meshes, point clouds and strand sets"
    TEXT "Operations that edit geometry with all its properties: merging, deleting,
triangulating, refining, smoothing, removing needles and laying strands.
Results do not depend on the number of threads."
    DEPENDS ${host_package}
    LIBRARIES "libModeling ${PROJECT_VERSION_MAJOR}")
add_package(ModelingDevelopment libmodeling-dev
    SECTION libdevel
    SUMMARY "headers of the geometry algorithms of Modeling"
    TEXT "Each header is the manual of its operation. With the CMake package Modeling
and the file modeling.pc for pkg-config."
    DEPENDS libmodeling${PROJECT_VERSION_MAJOR} ${host_development_package}
    FURTHER_DEPENDS libtbb-dev)
install(FILES README.md COMPONENT ModelingDevelopment DESTINATION ${CMAKE_INSTALL_DATADIR}/doc/libmodeling-dev)
if(MODELING_BUILD_PROGRAM)
    add_package(Program modeling
        SECTION graphics
        SUMMARY "geometry algorithms on the command line"
        TEXT "Reads, checks, repairs, edits, converts and shows meshes, point clouds and
strand sets in OBJ, PLY, STL, OFF, XYZ, glTF and HDF5 files. With the manuals
of the program and of the Python package."
        DEPENDS libmodeling${PROJECT_VERSION_MAJOR} ${host_package})
endif()
if(MODELING_BUILD_PYTHON)
    find_package(Python 3.11 REQUIRED COMPONENTS Interpreter)
    math(EXPR next_minor "${Python_VERSION_MINOR} + 1")
    # modeling has the modules that read and write volumes and HDF5 files.
    add_package(Python python3-modeling
        SECTION python
        SUMMARY "geometry algorithms for Python"
        TEXT "Meshes, point clouds and strand sets as NumPy arrays without copies, all
operations of Modeling, and batches of files."
        DEPENDS modeling libmodeling${PROJECT_VERSION_MAJOR} ${host_package}
        FURTHER_DEPENDS "python3 (>= 3.${Python_VERSION_MINOR}~), python3 (<< 3.${next_minor}), python3-numpy"
        RECOMMENDS "python3-distributed, python3-rich"
        SUGGESTS "python3-matplotlib, python3-vtk9")
endif()

set(CPACK_GENERATOR DEB)
set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_COMPONENTS_GROUPING IGNORE) # one package per component
set(CPACK_PACKAGING_INSTALL_PREFIX ${CMAKE_INSTALL_PREFIX})
set(CPACK_PACKAGE_CONTACT "${maintainer}")
set(CPACK_STRIP_FILES ON)
set(CPACK_VERBATIM_VARIABLES ON)
set(CPACK_INSTALL_DEFAULT_DIRECTORY_PERMISSIONS
    OWNER_READ OWNER_WRITE OWNER_EXECUTE GROUP_READ GROUP_EXECUTE WORLD_READ WORLD_EXECUTE)
set(CPACK_DEBIAN_PACKAGE_SOURCE modeling)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_COMPRESSION_TYPE xz)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS ${CMAKE_LIBRARY_OUTPUT_DIRECTORY}) # where it finds those of the other packages
set(CPACK_DEBIAN_PACKAGE_CONTROL_STRICT_PERMISSION ON)
include(CPack)
