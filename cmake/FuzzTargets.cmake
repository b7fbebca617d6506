# vorn_add_fuzzer(NAME LIBRARIES...): the libFuzzer program of NAME.cpp in this folder, with its seeds in
# corpus/NAME/. Its sources must be compiled for it: configure with clang and VORN_SANITIZE, which the
# preset "fuzz" does. ctest runs every seed once; scripts/fuzz runs the program for a given time.
add_custom_target(fuzzers)  # all of them

function(vorn_add_fuzzer name)
  set(target fuzz_${name})
  add_executable(${target} ${name}.cpp)
  add_dependencies(fuzzers ${target})
  target_link_libraries(${target} PRIVATE ${ARGN})
  target_link_options(${target} PRIVATE -fsanitize=fuzzer)
  set_target_properties(${target} PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/fuzz)
  file(GLOB seeds ${CMAKE_CURRENT_SOURCE_DIR}/corpus/${name}/*)
  add_test(NAME fuzz.${name} COMMAND ${target} ${seeds})
endfunction()
