# The line is written once, to standard error only, if the variable begins with a number other than 0.

set(line "^        Modeling: Tessara version 2\\.10\\.0\\.0 \\([0-9-]+, build 96, commit ([0-9a-f][0-9a-f][0-9a-f][0-9a-f][0-9a-f][0-9a-f][0-9a-f]|unknown), branch [^ ]+\\)\n$")

function(check value expected)
    execute_process(COMMAND ${CMAKE_COMMAND} -E env ${value} ${PROBE}
        OUTPUT_VARIABLE output ERROR_VARIABLE errors COMMAND_ERROR_IS_FATAL ANY)
    if(NOT errors MATCHES "${expected}" OR NOT output STREQUAL "")
        message(FATAL_ERROR "with ${value}: \"${errors}\" on standard error, \"${output}\" on standard output")
    endif()
endfunction()

check(--unset=ZEPHRAN_DUMP_VERSION_INFO "^$")
check(ZEPHRAN_DUMP_VERSION_INFO= "^$")
check(ZEPHRAN_DUMP_VERSION_INFO=0 "^$")
check(ZEPHRAN_DUMP_VERSION_INFO=yes "^$")
check(ZEPHRAN_DUMP_VERSION_INFO=1 "${line}")
check(ZEPHRAN_DUMP_VERSION_INFO=-2x "${line}")
# If standard error is closed, the line must not be written to a file that reuses its descriptor.
execute_process(COMMAND sh -c "ZEPHRAN_DUMP_VERSION_INFO=1 '${PROBE}' 2>&-"
    OUTPUT_VARIABLE output COMMAND_ERROR_IS_FATAL ANY)
if(NOT output STREQUAL "")
    message(FATAL_ERROR "with standard error closed: \"${output}\"")
endif()
