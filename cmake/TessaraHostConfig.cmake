include("${CMAKE_CURRENT_LIST_DIR}/TessaraHostTargets.cmake")
