# Finds the C library of HDF5 by its header and library alone. The module that CMake provides needs the language C, and links
# everything that HDF5 itself depends on.

find_path(Hdf5C_INCLUDE_DIR hdf5.h PATH_SUFFIXES hdf5/serial)
find_library(Hdf5C_LIBRARY NAMES hdf5_serial hdf5)
mark_as_advanced(Hdf5C_INCLUDE_DIR Hdf5C_LIBRARY)

include(FindPackageHandleStandardArgs)
find_package_handle_standard_args(Hdf5C REQUIRED_VARS Hdf5C_LIBRARY Hdf5C_INCLUDE_DIR)

if(Hdf5C_FOUND AND NOT TARGET Hdf5C::hdf5)
    add_library(Hdf5C::hdf5 UNKNOWN IMPORTED)
    set_target_properties(Hdf5C::hdf5 PROPERTIES
        IMPORTED_LOCATION ${Hdf5C_LIBRARY}
        INTERFACE_INCLUDE_DIRECTORIES ${Hdf5C_INCLUDE_DIR})
endif()
