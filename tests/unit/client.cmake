tavro_unit_test(client_test
  SOURCES
    unit/client_support.cpp
    unit/client_bridge_test.cpp
    unit/client_dispatch_test.cpp
    unit/client_drafts_test.cpp
    unit/client_launch_tables_test.cpp
    unit/client_lifecycle_test.cpp
    unit/client_system_log_test.cpp
    unit/client_text_test.cpp
  LIBS tavro_client)
target_compile_definitions(client_test PRIVATE TAVRO_LAUNCH_DOCUMENT="${PROJECT_SOURCE_DIR}/docs/launch-requests.md")

tavro_unit_test(client_recovery_test
  SOURCES
    unit/client_support.cpp
    unit/client_recovery_test.cpp
  LIBS tavro_client)
