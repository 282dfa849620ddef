# The folders of an installation, relative to its prefix. Everything in it finds the rest relative to itself, so that it can be
# moved. Debian packages are the exception: their folders are fixed, and the loader searches that of the libraries anyway.

option(MODELING_DEBIAN_PACKAGES "Install as Debian packages do; scripts/package sets it, with the prefix /usr" OFF)

set(MODELING_MODULE_DIR ${CMAKE_INSTALL_LIBDIR}/modeling) # modules that are loaded by name, which nobody links
if(MODELING_DEBIAN_PACKAGES)
    set(MODELING_PYTHON_DIR lib/python3/dist-packages)
    set(MODELING_ZSH_DIR ${CMAKE_INSTALL_DATADIR}/zsh/vendor-completions)
    set(MODELING_DOC_DIR ${CMAKE_INSTALL_DATADIR}/doc/modeling)
else()
    set(MODELING_PYTHON_DIR ${CMAKE_INSTALL_LIBDIR}/python3) # one entry of PYTHONPATH
    set(MODELING_ZSH_DIR ${CMAKE_INSTALL_DATADIR}/zsh/site-functions)
    set(MODELING_DOC_DIR ${CMAKE_INSTALL_DATADIR}/doc/Modeling)
endif()

# Lets a target that is installed in `folder` find the project's libraries, and the modules if MODULES is given.
function(modeling_set_install_rpath target folder)
    set(searched)
    if(NOT MODELING_DEBIAN_PACKAGES)
        list(APPEND searched ${CMAKE_INSTALL_LIBDIR})
    endif()
    if("MODULES" IN_LIST ARGN)
        list(APPEND searched ${MODELING_MODULE_DIR})
    endif()
    set(rpath)
    foreach(directory IN LISTS searched)
        file(RELATIVE_PATH path /${folder} /${directory})
        string(REGEX REPLACE "/$" "" entry "$ORIGIN/${path}")
        list(APPEND rpath ${entry})
    endforeach()
    set_target_properties(${target} PROPERTIES INSTALL_RPATH "${rpath}")
endfunction()

# Installs the pkg-config file cmake/<name>.pc.in.
function(modeling_install_pkg_config name component)
    set(folder ${CMAKE_INSTALL_LIBDIR}/pkgconfig)
    if(MODELING_DEBIAN_PACKAGES)
        set(prefix ${CMAKE_INSTALL_PREFIX}) # pkg-config leaves out folders that compilers search anyway, if it recognizes them
    else()
        file(RELATIVE_PATH prefix /${folder} /)
        string(REGEX REPLACE "/$" "" prefix "\${pcfiledir}/${prefix}")
    endif()
    configure_file(${PROJECT_SOURCE_DIR}/cmake/${name}.pc.in ${CMAKE_CURRENT_BINARY_DIR}/${name}.pc @ONLY)
    install(FILES ${CMAKE_CURRENT_BINARY_DIR}/${name}.pc DESTINATION ${folder} COMPONENT ${component})
endfunction()
