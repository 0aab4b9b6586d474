# What an installed Quillmere offers other builds: a CMake package
# (find_package(Quillmere) -> Quillmere::quillmere), a pkg-config file and the
# Python package. Every file locates the rest relative to itself, so an
# install with --prefix or DESTDIR, or a tree moved later, still works.
include(CMakePackageConfigHelpers)

set(QM_PACKAGE_DATA_DIR ${CMAKE_INSTALL_DATADIR}/quillmere)
set(QM_CMAKE_PACKAGE_DIR ${CMAKE_INSTALL_LIBDIR}/cmake/Quillmere)
set(QM_PYTHON_DIR ${QM_PACKAGE_DATA_DIR}/python)

install(EXPORT QuillmereTargets NAMESPACE Quillmere:: DESTINATION ${QM_CMAKE_PACKAGE_DIR})
configure_package_config_file(${CMAKE_CURRENT_LIST_DIR}/QuillmereConfig.cmake.in
  ${CMAKE_CURRENT_BINARY_DIR}/QuillmereConfig.cmake
  INSTALL_DESTINATION ${QM_CMAKE_PACKAGE_DIR}
  PATH_VARS CMAKE_INSTALL_INCLUDEDIR QM_PACKAGE_DATA_DIR)
# The soname changes with the major version, so only that must match.
write_basic_package_version_file(${CMAKE_CURRENT_BINARY_DIR}/QuillmereConfigVersion.cmake
  VERSION ${PROJECT_VERSION} COMPATIBILITY SameMajorVersion)
install(FILES ${CMAKE_CURRENT_BINARY_DIR}/QuillmereConfig.cmake
              ${CMAKE_CURRENT_BINARY_DIR}/QuillmereConfigVersion.cmake
        DESTINATION ${QM_CMAKE_PACKAGE_DIR})

# A relative path from one folder of the install tree to another; absolute
# install dirs (a distribution's layout) are used as they are.
function(qm_relative_install_path out from to)
  if(IS_ABSOLUTE "${to}")
    set(${out} "${to}" PARENT_SCOPE)
  else()
    file(RELATIVE_PATH relative "/prefix/${from}" "/prefix/${to}")
    string(REGEX REPLACE "/$" "" relative "${relative}")
    if(relative STREQUAL "")
      set(relative ".")
    endif()
    set(${out} "${relative}" PARENT_SCOPE)
  endif()
endfunction()

qm_relative_install_path(QM_PC_PREFIX_FROM_PCDIR ${CMAKE_INSTALL_LIBDIR}/pkgconfig "")
configure_file(${CMAKE_CURRENT_LIST_DIR}/quillmere.pc.in
  ${CMAKE_CURRENT_BINARY_DIR}/quillmere.pc @ONLY)
install(FILES ${CMAKE_CURRENT_BINARY_DIR}/quillmere.pc
        DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig)

# The Python package, with a note of where the library lies from it.
qm_relative_install_path(QM_PYTHON_TO_LIBDIR ${QM_PYTHON_DIR}/quillmere ${CMAKE_INSTALL_LIBDIR})
configure_file(${CMAKE_CURRENT_LIST_DIR}/python_installed.py.in
  ${CMAKE_CURRENT_BINARY_DIR}/python/_installed.py @ONLY)
install(DIRECTORY ${PROJECT_SOURCE_DIR}/bindings/python/quillmere DESTINATION ${QM_PYTHON_DIR}
        FILES_MATCHING PATTERN "*.py" PATTERN "__pycache__" EXCLUDE)
install(FILES ${CMAKE_CURRENT_BINARY_DIR}/python/_installed.py
        DESTINATION ${QM_PYTHON_DIR}/quillmere)
