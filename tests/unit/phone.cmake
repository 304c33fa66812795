tavro_unit_test(phone_test SOURCES ${CMAKE_CURRENT_SOURCE_DIR}/unit/phone_test.cpp LIBS tavro_phone_parts)
