# vorn_add_module(TARGET OUTPUT_NAME OBJECTS SYMBOLS): the module OUTPUT_NAME.so of the object library OBJECTS, below
# modules/ of the build folder. It exports the symbols that the version script SYMBOLS names, and leaves the operations
# of the platform to the libvornplatform.so that is loaded.
function(vorn_add_module target output_name objects symbols)
  if(VORN_WITH_LINUX)
    set(platform_library vornplatform)
  else()
    set(platform_library vorn_fake_platform)
  endif()

  add_library(${target} MODULE)
  target_link_libraries(${target} PRIVATE ${objects} ${platform_library})
  target_link_options(${target} PRIVATE -Wl,--version-script=${symbols})
  if(NOT VORN_SANITIZE)
    target_link_options(${target} PRIVATE -Wl,-z,defs)
  endif()
  set_target_properties(${target} PROPERTIES
    PREFIX "" OUTPUT_NAME ${output_name} LINK_DEPENDS ${symbols}
    LIBRARY_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/modules INSTALL_RPATH "$ORIGIN/../..")
  install(TARGETS ${target} LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR}/vorn/modules)
endfunction()
