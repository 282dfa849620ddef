# The installed tree, library and stand-ins together, can be used by a project that knows only its prefix.

include(${CMAKE_CURRENT_LIST_DIR}/consumer.cmake)

set(folder ${BUILD_DIR}/package-test/together)
file(REMOVE_RECURSE ${folder})
run(${CMAKE_COMMAND} --install ${BUILD_DIR} --prefix ${folder}/prefix)
run_consumer(${folder}/consumer "" ${folder}/prefix)
