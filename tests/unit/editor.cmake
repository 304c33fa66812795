# The image editor: the crop box without a screen, and the page with real widgets, painted into memory.
tavro_unit_test(selectbox_test SOURCES unit/selectbox_test.cpp unit/editor_test.cpp LIBS tavro_client)
set_target_properties(selectbox_test PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/tests/screens)
target_include_directories(selectbox_test PRIVATE ${PROJECT_SOURCE_DIR}/src)
add_dependencies(selectbox_test tavro_resources)
