# Protection against exploits of memory errors, for all targets. It must neither change results nor cost time.

include(CheckPIESupported)
check_pie_supported(LANGUAGES CXX)
set(CMAKE_POSITION_INDEPENDENT_CODE ON) # so that programs can be loaded at any address

add_library(modeling_hardening INTERFACE)
# All symbols are bound when a file is loaded, and then its tables are read-only.
target_link_options(modeling_hardening INTERFACE LINKER:-z,relro LINKER:-z,now)
