# Whether a crash is asked about, and as what; what is remembered of it.
tavro_unit_test(crash_rules_test SOURCES unit/crash_rules_test.cpp LIBS tavro_client)
