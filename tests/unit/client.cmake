tavro_unit_test(client_test
  SOURCES
    unit/client_support.cpp
    unit/client_bridge_test.cpp
    unit/client_dispatch_test.cpp
    unit/client_drafts_test.cpp
    unit/client_lifecycle_test.cpp
    unit/client_system_log_test.cpp
    unit/client_text_test.cpp
  LIBS tavro_client)

tavro_unit_test(client_recovery_test
  SOURCES
    unit/client_support.cpp
    unit/client_recovery_test.cpp
  LIBS tavro_client)
