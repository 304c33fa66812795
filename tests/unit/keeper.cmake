# What is kept of a compose screen, and what other applications share with it; with real widgets.
tavro_unit_test(keeper_test SOURCES unit/keeper_test.cpp LIBS tavro_client)
set_target_properties(keeper_test PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/tests/screens)
add_dependencies(keeper_test tavro_resources)
