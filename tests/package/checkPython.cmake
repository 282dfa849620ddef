# The installed Python package works from its prefix alone: it finds the libraries and the codecs of volumes and HDF5 files.

include(${CMAKE_CURRENT_LIST_DIR}/consumer.cmake)

set(folder ${BUILD_DIR}/package-test/python)
file(REMOVE_RECURSE ${folder})
run(${CMAKE_COMMAND} --install ${BUILD_DIR} --prefix ${folder}/prefix)
file(RENAME ${folder}/prefix ${folder}/moved)
run(${CMAKE_COMMAND} -E env PYTHONPATH=${folder}/moved/${LIBDIR}/python3
    ${PYTHON} -c "import modeling, sys; sys.exit(not modeling.__file__.startswith('${folder}/moved'))")
