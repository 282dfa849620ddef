include(CMakeFindDependencyMacro)
find_dependency(TBB)
# If the stand-ins of the host are installed, they are next to this package.
find_dependency(TessaraHost HINTS "${CMAKE_CURRENT_LIST_DIR}/../TessaraHost")
include("${CMAKE_CURRENT_LIST_DIR}/ModelingTargets.cmake")
