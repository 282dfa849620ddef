# The library builds against a host that is installed elsewhere, and so do the tests of hosts; the stand-ins, installed separately,
# take its place.

include(${CMAKE_CURRENT_LIST_DIR}/consumer.cmake)

set(folder ${BUILD_DIR}/package-test/apart)
file(REMOVE_RECURSE ${folder})
foreach(component TessaraHost TessaraHostDevelopment)
    run(${CMAKE_COMMAND} --install ${BUILD_DIR} --component ${component} --prefix ${folder}/host)
endforeach()
# Whether it can be built and linked does not depend on the optimization level.
run(${CMAKE_COMMAND} -S ${SOURCE_DIR} -B ${folder}/build ${flags} -DMODELING_HOST=external
    -DCMAKE_CXX_FLAGS_RELEASE=-O1
    -DCMAKE_PREFIX_PATH=${folder}/host -DMODELING_SANITIZE=${SANITIZE} -DMODELING_WARNINGS_AS_ERRORS=ON
    -DMODELING_BUILD_TESTS=OFF -DMODELING_BUILD_PROGRAM=OFF)
run(${CMAKE_COMMAND} --build ${folder}/build)
run(${CMAKE_COMMAND} --install ${folder}/build --prefix ${folder}/modeling)
if(EXISTS ${folder}/modeling/include/OrvanCore)
    message(FATAL_ERROR "an installation for an external host holds host headers")
endif()
run_consumer(${folder}/consumer ${folder}/host/lib ${folder}/modeling ${folder}/host)

run(${CMAKE_COMMAND} -S ${SOURCE_DIR}/tests/host/conformance -B ${folder}/conformance ${flags} -DCMAKE_CXX_FLAGS_RELEASE=-O0
    -DCMAKE_PREFIX_PATH=${folder}/host -DModeling_ROOT=${folder}/modeling -DCMAKE_UNITY_BUILD=ON
    -DHOST_FIXTURE=${SOURCE_DIR}/tests/host/conformance/standinFixture.cpp)
run(${CMAKE_COMMAND} --build ${folder}/conformance)
run(${CMAKE_CTEST_COMMAND} --test-dir ${folder}/conformance --no-tests=error)
if(NOT output MATCHES "OperationsByVolume" OR output MATCHES "Skipped")
    message(FATAL_ERROR "the conformance tests said: ${output}")
endif()
