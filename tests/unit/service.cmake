# The upload service as the phone runs it, against the real desk and against one that misbehaves.
tavro_unit_test(service_test
  SOURCES unit/service_test.cpp unit/service_faults_test.cpp unit/service_world.cpp
  LIBS tavro_store tavro_companion)
add_dependencies(service_test corvane.tavro-svc tavro-desk)
target_compile_definitions(service_test PRIVATE
  TAVRO_SVC_PROGRAM="$<TARGET_FILE:corvane.tavro-svc>" TAVRO_DESK_PROGRAM="$<TARGET_FILE:tavro-desk>")
