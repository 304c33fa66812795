# Pictures without a screen: decoding, hiding, cropping, metadata.
tavro_unit_test(image_test
  SOURCES unit/image_test.cpp unit/image_strip_test.cpp
  LIBS tavro_client PkgConfig::PNG PkgConfig::WEBP PkgConfig::TURBOJPEG)
