# vorn_add_test(NAME LIBRARIES...): the test program of NAME.cpp in this folder, run by ctest as
# "FOLDER.NAME". It may include only the public headers of its libraries.
function(vorn_add_test name)
  get_filename_component(folder ${CMAKE_CURRENT_SOURCE_DIR} NAME)
  set(target ${folder}_${name})
  add_executable(${target} ${name}.cpp)
  target_link_libraries(${target} PRIVATE ${ARGN} GTest::gmock_main)
  set_target_properties(${target} PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/tests)
  add_test(NAME ${folder}.${name} COMMAND ${target})
  set_tests_properties(${folder}.${name} PROPERTIES TIMEOUT 900)
endfunction()
