# The diagnostic collector.
tavro_unit_test(dc_test SOURCES unit/dc_test.cpp unit/dc_threads_test.cpp LIBS tavro_dc)
# In memory: each archive waits for the disk, and what a disk holds after a loss of power does not matter here.
if(IS_DIRECTORY /dev/shm)
  set_tests_properties(dc_test PROPERTIES ENVIRONMENT TMPDIR=/dev/shm)
endif()
