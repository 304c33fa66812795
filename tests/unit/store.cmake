# Allocation tracker and local store, each against the real thing in a phone of its own.
tavro_unit_test(memcheck_test SOURCES unit/memcheck_test.cpp LIBS tavro_base)
tavro_unit_test(store_test LIBS tavro_store SOURCES
  unit/store_schema_test.cpp
  unit/store_report_test.cpp
  unit/store_server_state_test.cpp
  unit/store_journal_test.cpp)
