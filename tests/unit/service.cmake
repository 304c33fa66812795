# The upload service as the phone runs it, against the real desk and against one that misbehaves; and the desk.
tavro_unit_test(service_test
  SOURCES unit/service_test.cpp unit/service_faults_test.cpp unit/service_world.cpp
  LIBS tavro_store tavro_companion)
add_dependencies(service_test corvane.tavro-svc tavro-desk)
target_compile_definitions(service_test PRIVATE
  TAVRO_SVC_PROGRAM="$<TARGET_FILE:corvane.tavro-svc>" TAVRO_DESK_PROGRAM="$<TARGET_FILE:tavro-desk>")

find_program(PYTHON3 NAMES python3 PATHS /usr/bin NO_DEFAULT_PATH REQUIRED)
add_test(NAME desk_test
  COMMAND ${PYTHON3} -m pytest -q -p no:cacheprovider ${CMAKE_CURRENT_SOURCE_DIR}/e2e/desk_test.py)
set_tests_properties(desk_test PROPERTIES TIMEOUT 120 ENVIRONMENT "TAVRO_DESK=$<TARGET_FILE:tavro-desk>")
