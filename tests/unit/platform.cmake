# The platform's own tests, and the sample applications that they start through the bus.
set(sample_apps ${CMAKE_BINARY_DIR}/tests/apps)
foreach(sample test.sample-service test.window)
  add_executable(${sample} ${CMAKE_CURRENT_LIST_DIR}/platform_sample_app.cpp)
  target_link_libraries(${sample} PRIVATE tavro_platform tavro_options)
  set_target_properties(${sample} PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${sample_apps}/${sample}/bin)
endforeach()
target_link_libraries(test.window PRIVATE tavro_platform_ui)
target_compile_definitions(test.window PRIVATE TAVRO_SAMPLE_HAS_WINDOW)

tavro_unit_test(platform_test
  SOURCES unit/platform_launch_test.cpp unit/platform_log_test.cpp unit/platform_preference_test.cpp
          unit/platform_services_test.cpp
  LIBS tavro_platform)
target_include_directories(platform_test PRIVATE ${PROJECT_SOURCE_DIR}/platform/linux)
target_compile_definitions(platform_test PRIVATE TAVRO_SAMPLE_APPS="${sample_apps}")
add_dependencies(platform_test test.sample-service test.window)

# Keys for the end-to-end tests.
add_executable(press_keys ${CMAKE_CURRENT_LIST_DIR}/../support/press_keys.cpp)
target_link_libraries(press_keys PRIVATE PkgConfig::ELEMENTARY tavro_options)
set_target_properties(press_keys PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/tests)
