# What an installation holds, and the Debian package. Everything lies below lib/tavro as in the build tree, so that
# the phone finds its applications beside it; users see one command and one desktop entry.
set(TAVRO_HOME lib/tavro)
set(TAVRO_PHONE_PROGRAM ${CMAKE_INSTALL_PREFIX}/${TAVRO_HOME}/bin/tavro-phone)
install(DIRECTORY ${CMAKE_BINARY_DIR}/apps/org.tizen.system.crash DESTINATION ${TAVRO_HOME}/apps
        USE_SOURCE_PERMISSIONS)
foreach(app corvane.tavro-lite corvane.tavro-svc corvane.tavro-screen-recorder)
  set(entry ${CMAKE_BINARY_DIR}/packaging/${app}.desktop)
  configure_file(${PROJECT_SOURCE_DIR}/packaging/${app}.desktop.in ${entry} @ONLY)
  install(DIRECTORY ${CMAKE_BINARY_DIR}/apps/${app} DESTINATION ${TAVRO_HOME}/apps USE_SOURCE_PERMISSIONS
          PATTERN *.desktop EXCLUDE)
  install(FILES ${entry} DESTINATION ${TAVRO_HOME}/apps/${app})
endforeach()
install(FILES ${CMAKE_BINARY_DIR}/packaging/corvane.tavro-lite.desktop DESTINATION share/applications)
install(FILES ${PROJECT_SOURCE_DIR}/packaging/corvane.tavro-lite.svg
        DESTINATION share/icons/hicolor/scalable/apps)
install(PROGRAMS ${CMAKE_BINARY_DIR}/bin/tavro-phone ${CMAKE_BINARY_DIR}/bin/tavro-desk
                 ${CMAKE_BINARY_DIR}/bin/tavro-core-handler
        DESTINATION ${TAVRO_HOME}/bin)
install(CODE "
  file(MAKE_DIRECTORY \"\$ENV{DESTDIR}\${CMAKE_INSTALL_PREFIX}/bin\")
  file(CREATE_LINK ../${TAVRO_HOME}/bin/tavro-phone
       \"\$ENV{DESTDIR}\${CMAKE_INSTALL_PREFIX}/bin/tavro-phone\" SYMBOLIC)")

set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_NAME tavro)
set(CPACK_PACKAGE_VERSION ${PROJECT_VERSION})
set(CPACK_PACKAGE_CONTACT "The Vantor Community developers <tavro@localhost>")
set(CPACK_PACKAGE_DESCRIPTION_SUMMARY "Vantor Community: report problems, share ideas, get answers")
set(CPACK_PACKAGING_INSTALL_PREFIX ${CMAKE_INSTALL_PREFIX})
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
set(CPACK_DEBIAN_PACKAGE_DEPENDS
    "bubblewrap, dbus, at-spi2-core, xvfb, openbox, x11-utils, imagemagick, dunst, fonts-noto-core, \
gstreamer1.0-plugins-base, gstreamer1.0-plugins-good, gstreamer1.0-plugins-ugly")
set(CPACK_DEBIAN_PACKAGE_SECTION utils)
set(CPACK_STRIP_FILES ON)
include(CPack)
