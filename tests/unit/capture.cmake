tavro_unit_test(capture_test SOURCES unit/capture_test.cpp LIBS tavro_client)
target_link_options(capture_test PRIVATE LINKER:--wrap=notification_status_message_post)
