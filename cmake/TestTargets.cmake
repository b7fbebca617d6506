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

# vorn_check_answers(PART DESCRIPTOR TEST...): adds the test contract.PART_answers, which compares the answers that these
# tests record with the descriptor of the methods. The answers are in the folder answers/PART of the build.
function(vorn_check_answers part descriptor)
  set(answers ${PROJECT_BINARY_DIR}/answers/${part})
  file(MAKE_DIRECTORY ${answers})
  set_tests_properties(${ARGN} PROPERTIES
    ENVIRONMENT VORN_RECORD_ANSWERS=${answers} FIXTURES_SETUP ${part}_answers)
  list(TRANSFORM ARGN REPLACE "[.]" "_" OUTPUT_VARIABLE programs)
  add_test(NAME contract.${part}_answers
    COMMAND /usr/bin/python3 ${PROJECT_SOURCE_DIR}/tests/contract/contract_answers.py  # Debian's, which has Debian's jsonschema
      ${descriptor} ${answers} ${programs})
  set_tests_properties(contract.${part}_answers PROPERTIES FIXTURES_REQUIRED ${part}_answers SKIP_RETURN_CODE 77)
endfunction()
