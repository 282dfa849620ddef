# The installed Python package works from its prefix alone: it finds the libraries and the codecs of volumes and HDF5 files.

include(${CMAKE_CURRENT_LIST_DIR}/consumer.cmake)

set(folder ${BUILD_DIR}/package-test/python)
file(REMOVE_RECURSE ${folder})
file(MAKE_DIRECTORY ${folder})
# The example of the README reads a sample.
file(CREATE_LINK ${SOURCE_DIR}/samples ${folder}/samples SYMBOLIC)
file(READ ${SOURCE_DIR}/README.md readme)
write_block(python "${readme}" ${folder}/readme.py)
run(${CMAKE_COMMAND} -E chdir ${folder} ${CMAKE_COMMAND} -E env PYTHONPATH=${INSTALLED}/${LIBDIR}/python3
    ${PYTHON} -c "
import modeling
assert modeling.__file__.startswith('${INSTALLED}'), modeling.__file__
exec(open('readme.py').read())
modeling.write(fine, 'fine.h5')
assert modeling.read('fine.h5') == fine and fine.face_count > 10000")

# So do the installed examples, with the installed samples. VTK is optional; the tests of Python run that example.
file(GLOB examples ${INSTALLED}/${DATADIR}/Modeling/examples/python/*.py)
list(FILTER examples EXCLUDE REGEX "drawing|vtk_round_trip")
list(LENGTH examples count)
if(NOT count EQUAL 5)
    message(FATAL_ERROR "examples are missing: ${examples}")
endif()
foreach(example ${examples})
    run(${CMAKE_COMMAND} -E chdir ${folder} ${CMAKE_COMMAND} -E env PYTHONPATH=${INSTALLED}/${LIBDIR}/python3
        PYTHONDONTWRITEBYTECODE=1 ${PYTHON} ${example})
endforeach()
