# The screens with real widgets, painted into memory, and the plain logic behind them. A program finds the
# layouts beside the folder that it lies in, as an application does.
tavro_unit_test(compose_test SOURCES unit/compose_test.cpp unit/compose_log_test.cpp LIBS tavro_client)
set_target_properties(compose_test PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/tests/screens)
target_include_directories(compose_test PRIVATE ${PROJECT_SOURCE_DIR}/src)
add_dependencies(compose_test tavro_resources)
file(CREATE_LINK ${TAVRO_APPS_DIR}/corvane.tavro-lite/res ${CMAKE_BINARY_DIR}/tests/res SYMBOLIC)
tavro_unit_test(screens_test SOURCES unit/screens_test.cpp LIBS tavro_client)
