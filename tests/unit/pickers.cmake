# What the pickers show: targets, applications, the gallery and its thumbnails.
tavro_unit_test(pickers_test
  SOURCES unit/picker_targets_test.cpp unit/picker_pictures_test.cpp
  LIBS tavro_client PkgConfig::PNG)
