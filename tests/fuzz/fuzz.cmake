# The fuzz target: driven by libFuzzer in the preset "fuzz", else by its seeds alone, as a test.
add_executable(store_fuzz fuzz/store_fuzz.cpp)
target_link_libraries(store_fuzz PRIVATE tavro_client tavro_options)
set_target_properties(store_fuzz PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/tests)
if(TAVRO_FUZZ)
  target_link_options(store_fuzz PRIVATE -fsanitize=fuzzer)
else()
  target_sources(store_fuzz PRIVATE fuzz/replay_main.cpp)
  add_test(NAME store_fuzz_seeds COMMAND
    ${PROJECT_SOURCE_DIR}/tests/support/in_phone $<TARGET_FILE:store_fuzz>
    ${PROJECT_SOURCE_DIR}/tests/fuzz/seeds)
endif()
