# The programs and tests of this tree link static libraries; others get both kinds. `target` is the static one,
# installed as picturezor::<name>_static, and its objects make a shared one as well, picturezor::<name>.
function(install_library target name)
  set(file picturezor)
  if(NOT name STREQUAL "picturezor")
    string(APPEND file "_${name}")
  endif()
  # Their headers say what is public.
  set_target_properties(${target} PROPERTIES
    CXX_VISIBILITY_PRESET default OUTPUT_NAME ${file} EXPORT_NAME ${name}_static)
  install(TARGETS ${target} EXPORT picturezorTargets
    ARCHIVE DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT development)
  install(DIRECTORY include/picturezor DESTINATION ${CMAKE_INSTALL_INCLUDEDIR} COMPONENT development)
  add_library(picturezor_shared_${name} SHARED $<TARGET_OBJECTS:${target}>)
  get_target_property(libraries ${target} LINK_LIBRARIES)
  list(TRANSFORM libraries REPLACE "^picturezor_host$" "picturezor_shared_picturezor")
  target_link_libraries(picturezor_shared_${name} PRIVATE ${libraries})
  if(NOT name STREQUAL "picturezor")
    target_link_libraries(picturezor_shared_${name} INTERFACE picturezor_shared_picturezor)
  endif()
  target_compile_features(picturezor_shared_${name} INTERFACE cxx_std_20)
  target_include_directories(picturezor_shared_${name} INTERFACE
    $<INSTALL_INTERFACE:${CMAKE_INSTALL_INCLUDEDIR}>)
  set_target_properties(picturezor_shared_${name} PROPERTIES OUTPUT_NAME ${file} EXPORT_NAME ${name}
    VERSION ${PROJECT_VERSION} SOVERSION ${PROJECT_VERSION_MAJOR} LINKER_LANGUAGE CXX)
  install(TARGETS picturezor_shared_${name} EXPORT picturezorTargets
    LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR} COMPONENT runtime NAMELINK_COMPONENT development)
endfunction()
