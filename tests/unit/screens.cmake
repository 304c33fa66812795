# The screens with real widgets.
tavro_unit_test(screens_test SOURCES unit/screens_test.cpp LIBS tavro_client)
