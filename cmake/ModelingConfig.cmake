include(CMakeFindDependencyMacro)
find_dependency(TBB)
# The stand-ins of the host, where they are installed, stand beside this package.
find_dependency(TessaraHost HINTS "${CMAKE_CURRENT_LIST_DIR}/../TessaraHost")
include("${CMAKE_CURRENT_LIST_DIR}/ModelingTargets.cmake")
