# Allocation tracker and local store, each against the real thing in a phone of its own.
tavro_unit_test(memcheck_test SOURCES unit/memcheck_test.cpp LIBS tavro_base)
tavro_unit_test(store_test LIBS tavro_store SOURCES
  unit/store_schema_test.cpp
  unit/store_report_test.cpp
  unit/store_search_test.cpp
  unit/store_server_state_test.cpp
  unit/store_catalogue_test.cpp
  unit/store_journal_test.cpp)
target_include_directories(store_test PRIVATE ${PROJECT_SOURCE_DIR}/src)

# Faults, in a program of their own: they take their time.
tavro_unit_test(store_fault_test LIBS tavro_store SOURCES
  unit/store_damage_test.cpp
  unit/store_fault_test.cpp
  unit/store_kill_test.cpp)

# The same tests under valgrind, which looks for leaks and wrong reads; in memory, as what a disk holds after a
# kill does not matter here. Without those that kill processes at many moments: they are about time, and a killed
# process shows no leaks.
find_program(VALGRIND valgrind)
function(tavro_valgrind_test program left_out)
  add_test(NAME ${program}_valgrind COMMAND ${PROJECT_SOURCE_DIR}/tests/support/in_phone
    ${VALGRIND} --quiet --leak-check=full --show-leak-kinds=definite,possible
    --errors-for-leak-kinds=definite,possible --error-exitcode=99
    $<TARGET_FILE:${program}> --gtest_filter=-${left_out})
  set_tests_properties(${program}_valgrind PROPERTIES TIMEOUT 300)
  if(IS_DIRECTORY /dev/shm)
    set_tests_properties(${program}_valgrind PROPERTIES ENVIRONMENT TMPDIR=/dev/shm)
  endif()
endfunction()
if(VALGRIND AND NOT TAVRO_SANITIZE)
  tavro_valgrind_test(store_test *KilledAtAnyMoment*)
  tavro_valgrind_test(store_fault_test StoreKill.*)
endif()
