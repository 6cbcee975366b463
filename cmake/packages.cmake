# What CMake and pkg-config need to know of the installed libraries, and Debian packages of it all (cpack -G DEB).
include(CMakePackageConfigHelpers)
set(cmake_dir ${CMAKE_INSTALL_LIBDIR}/cmake/picturezor)
configure_package_config_file(cmake/picturezorConfig.cmake.in picturezorConfig.cmake INSTALL_DESTINATION ${cmake_dir})
write_basic_package_version_file(picturezorConfigVersion.cmake COMPATIBILITY SameMajorVersion)
install(FILES ${CMAKE_BINARY_DIR}/picturezorConfig.cmake ${CMAKE_BINARY_DIR}/picturezorConfigVersion.cmake
  DESTINATION ${cmake_dir} COMPONENT development)
install(EXPORT picturezorTargets NAMESPACE picturezor:: DESTINATION ${cmake_dir} COMPONENT development)

file(RELATIVE_PATH to_prefix /${CMAKE_INSTALL_LIBDIR}/pkgconfig /)
string(REPLACE ";" " " files_libraries "${PICTUREZOR_FILES_LIBRARIES}")
set(modules picturezor)
if(PICTUREZOR_CLI)
  list(APPEND modules picturezor-files)
endif()
foreach(module ${modules})
  configure_file(cmake/${module}.pc.in ${module}.pc @ONLY)
  install(FILES ${CMAKE_BINARY_DIR}/${module}.pc DESTINATION ${CMAKE_INSTALL_LIBDIR}/pkgconfig COMPONENT development)
endforeach()

set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_PACKAGE_VENDOR PictureZOR)
set(CPACK_PACKAGE_CONTACT "PictureZOR's developers <maintainers@example.org>")
set(CPACK_STRIP_FILES ON)
set(CPACK_DEB_COMPONENT_INSTALL ON)
set(CPACK_COMPONENTS_ALL runtime development batch)
set(CPACK_DEBIAN_FILE_NAME DEB-DEFAULT)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
# The libraries of one package are looked for while the other is made.
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS ${CMAKE_BINARY_DIR})
set(CPACK_DEBIAN_RUNTIME_PACKAGE_NAME picturezor)
set(CPACK_DEBIAN_RUNTIME_PACKAGE_SECTION graphics)
set(CPACK_COMPONENT_RUNTIME_DESCRIPTION "Images larger than memory, the same bytes on every machine
 The command picturezor, the shared libraries and the module that does the work.")
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_NAME libpicturezor-dev)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_SECTION libdevel)
set(CPACK_DEBIAN_DEVELOPMENT_PACKAGE_DEPENDS
  "picturezor (= ${PROJECT_VERSION}), libpng-dev, libjpeg-dev, libtiff-dev, liblcms2-dev")
# Those that it is built with.
foreach(pair libwebp:libwebp-dev libopenjp2:libopenjp2-7-dev libisal:libisal-dev)
  string(REPLACE ":" ";" pair ${pair})
  list(GET pair 0 library)
  list(GET pair 1 package)
  if(library IN_LIST PICTUREZOR_FILES_LIBRARIES)
    string(APPEND CPACK_DEBIAN_DEVELOPMENT_PACKAGE_DEPENDS ", ${package}")
  endif()
endforeach()
set(CPACK_COMPONENT_DEVELOPMENT_DESCRIPTION "Headers and libraries for programs that use PictureZOR
 C++ headers, static libraries, and files for CMake and pkg-config.")
# Python alone, for any interpreter.
set(CPACK_DEBIAN_BATCH_PACKAGE_NAME picturezor-batch)
set(CPACK_DEBIAN_BATCH_PACKAGE_SECTION graphics)
set(CPACK_DEBIAN_BATCH_PACKAGE_ARCHITECTURE all)
set(CPACK_DEBIAN_BATCH_PACKAGE_SHLIBDEPS OFF)
set(CPACK_DEBIAN_BATCH_PACKAGE_DEPENDS
  "picturezor (= ${PROJECT_VERSION}), python3 (>= 3.9~), python3-distributed, python3-tqdm")
set(CPACK_COMPONENT_BATCH_DESCRIPTION "The same steps for many images, on one machine or many
 Hands out images, or parts of one image pyramid, to the workers of Dask's scheduler.")
if(PICTUREZOR_PYTHON)
  list(APPEND CPACK_COMPONENTS_ALL python)
  set(CPACK_DEBIAN_PYTHON_PACKAGE_NAME python3-picturezor)
  set(CPACK_DEBIAN_PYTHON_PACKAGE_SECTION python)
  # The module is built for one version of the interpreter.
  set(CPACK_DEBIAN_PYTHON_PACKAGE_DEPENDS
    "python3 (>= ${PICTUREZOR_PYTHON_VERSION}~), python3 (<< ${PICTUREZOR_PYTHON_NEXT_VERSION}~), python3-numpy")
  set(CPACK_DEBIAN_PYTHON_PACKAGE_SUGGESTS picturezor-batch)
  set(CPACK_COMPONENT_PYTHON_DESCRIPTION "Images larger than memory, the same bytes on every machine, in Python
 Pictures on numpy arrays, with all that PictureZOR does to them.")
endif()
include(CPack)
