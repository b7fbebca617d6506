# vorn_find_system_libraries(PREFIX MODULE...): pkg_check_modules with the imported target PkgConfig::PREFIX.
#
# krb5.pc names its folder with "-isystem". FindPkgConfig turns that into an include directory in the first
# configuration but reads it as a compiler option from its cache in all later ones, so that every configuration after
# the first would compile everything again. Here it is an include directory every time.
function(vorn_find_system_libraries prefix)
  pkg_check_modules(${prefix} REQUIRED IMPORTED_TARGET GLOBAL ${ARGN})
  set(target PkgConfig::${prefix})
  get_target_property(directories ${target} INTERFACE_INCLUDE_DIRECTORIES)
  if(NOT directories)
    set(directories "")  # the library's headers are in /usr/include
  endif()
  set(options ${${prefix}_CFLAGS_OTHER})
  list(FIND options -isystem position)
  while(NOT position EQUAL -1)
    list(REMOVE_AT options ${position})
    list(GET options ${position} directory)
    list(REMOVE_AT options ${position})
    list(APPEND directories ${directory})
    list(FIND options -isystem position)
  endwhile()
  list(REMOVE_DUPLICATES directories)
  set_target_properties(${target} PROPERTIES
    INTERFACE_INCLUDE_DIRECTORIES "${directories}" INTERFACE_COMPILE_OPTIONS "${options}")
endfunction()
