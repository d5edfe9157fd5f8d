# Where an installation keeps what. Everything finds everything else by relative paths, so that an installation may be
# made below any prefix and moved as a whole.
include(GNUInstallDirs)

# The platform's library and the modules: for our own programs, not for the linker's search.
set(VELT_INSTALL_LIBRARIES ${CMAKE_INSTALL_LIBDIR}/velt)
# Programs and modules that the platform starts or has loaded.
set(VELT_INSTALL_HELPERS ${CMAKE_INSTALL_LIBEXECDIR}/velt)

cmake_path(RELATIVE_PATH CMAKE_INSTALL_FULL_LIBDIR BASE_DIRECTORY ${CMAKE_INSTALL_FULL_SBINDIR}
    OUTPUT_VARIABLE velt_libraries_from_programs)
set(VELT_LIBRARIES_FROM_PROGRAMS ${velt_libraries_from_programs}/velt)
cmake_path(RELATIVE_PATH CMAKE_INSTALL_FULL_LIBEXECDIR BASE_DIRECTORY ${CMAKE_INSTALL_FULL_LIBDIR}/velt
    OUTPUT_VARIABLE velt_helpers_from_libraries)
set(VELT_HELPERS_FROM_LIBRARIES ${velt_helpers_from_libraries}/velt)
