# The installed tree, library and stand-ins together, can be used by a project that knows only its prefix: with CMake, and with
# pkg-config.

include(${CMAKE_CURRENT_LIST_DIR}/consumer.cmake)

set(folder ${BUILD_DIR}/package-test/together)
file(REMOVE_RECURSE ${folder})
run_consumer(${folder}/consumer "" ${INSTALLED})

run(${CMAKE_COMMAND} -E env PKG_CONFIG_LIBDIR=${INSTALLED}/${LIBDIR}/pkgconfig
    ${PKG_CONFIG} --cflags --libs "modeling >= 2.10")
separate_arguments(package_flags UNIX_COMMAND "${output}")
set(program ${folder}/consumer/with-pkg-config)
if(SANITIZE)
    list(APPEND package_flags -fsanitize=${SANITIZE})
endif()
run(${CXX_COMPILER} -std=c++20 ${folder}/consumer/main.cpp -o ${program} ${package_flags} -Wl,-rpath,${INSTALLED}/${LIBDIR})
run_program(${program})
