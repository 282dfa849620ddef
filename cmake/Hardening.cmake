# Protection against exploits of memory errors, for all targets. It must neither change results nor cost time.

include(CheckPIESupported)
check_pie_supported(LANGUAGES CXX)
set(CMAKE_POSITION_INDEPENDENT_CODE ON) # so that programs can be loaded at any address

add_library(modeling_hardening INTERFACE)
# All symbols are bound when a file is loaded, and then its tables are read-only.
target_link_options(modeling_hardening INTERFACE LINKER:-z,relro LINKER:-z,now)
# A target with this property has inner loops in which checking the stack takes a measurable part of the time.
target_compile_options(modeling_hardening INTERFACE
    $<$<NOT:$<BOOL:$<TARGET_PROPERTY:MODELING_UNPROTECTED_STACK>>>:-fstack-protector-strong>)
if(NOT MODELING_SANITIZE)
    # Calls of the C library check the sizes of buffers that the optimizer knows. Sanitizers check all of them.
    target_compile_options(modeling_hardening INTERFACE
        "$<$<CONFIG:Release,RelWithDebInfo,MinSizeRel>:-U_FORTIFY_SOURCE;-D_FORTIFY_SOURCE=2>")
endif()
