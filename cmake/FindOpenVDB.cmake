# Finds OpenVDB by its header and library alone. The module that OpenVDB provides requires the development packages of all
# its dependencies; the headers that this project includes need only those of oneTBB, Imath and Boost.

find_path(OpenVDB_INCLUDE_DIR openvdb/openvdb.h)
find_library(OpenVDB_LIBRARY openvdb)
find_path(OpenVDB_BOOST_INCLUDE_DIR boost/any.hpp)
find_package(Imath CONFIG QUIET)
if(OpenVDB_INCLUDE_DIR)
    file(STRINGS ${OpenVDB_INCLUDE_DIR}/openvdb/version.h version REGEX "define OPENVDB_LIBRARY_(MAJOR|MINOR|PATCH)_VERSION_NUMBER ")
    string(REGEX REPLACE "[^0-9;]" "" version "${version}")
    string(REPLACE ";" "." OpenVDB_VERSION "${version}")
endif()
mark_as_advanced(OpenVDB_INCLUDE_DIR OpenVDB_LIBRARY OpenVDB_BOOST_INCLUDE_DIR)

include(FindPackageHandleStandardArgs)
find_package_handle_standard_args(OpenVDB
    REQUIRED_VARS OpenVDB_LIBRARY OpenVDB_INCLUDE_DIR OpenVDB_BOOST_INCLUDE_DIR Imath_FOUND
    VERSION_VAR OpenVDB_VERSION)

if(OpenVDB_FOUND AND NOT TARGET OpenVDB::openvdb)
    add_library(OpenVDB::openvdb UNKNOWN IMPORTED)
    set_target_properties(OpenVDB::openvdb PROPERTIES
        IMPORTED_LOCATION ${OpenVDB_LIBRARY}
        INTERFACE_INCLUDE_DIRECTORIES "${OpenVDB_INCLUDE_DIR};${OpenVDB_BOOST_INCLUDE_DIR}"
        INTERFACE_LINK_LIBRARIES "Imath::Imath;TBB::tbb")
endif()
