# Deleting reports, with real widgets and files. Beside the screens' tests, where the layouts are found.
tavro_unit_test(delete_test SOURCES unit/delete_test.cpp LIBS tavro_client)
set_target_properties(delete_test PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/tests/screens)
add_dependencies(delete_test tavro_resources)
