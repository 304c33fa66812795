# What is sent with a report, and what is shown of it. With the texts of the client, beside which it lies.
tavro_unit_test(review_test SOURCES unit/review_test.cpp LIBS tavro_client PkgConfig::MINIZIP)
set_target_properties(review_test PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/tests/screens)
add_dependencies(review_test tavro_resources)
