# Linux: the application folder under /usr/lib (lintian reports /opt as an error), a command in
# /usr/bin, and the freedesktop.org pieces through which a desktop opens our documents with it.
# dpkg's triggers of desktop-file-utils, shared-mime-info and the icon theme update the desktop's
# databases, so the package has no maintainer scripts of its own.
# lintian's one warning, jar-not-in-usr-share (emu57.jar and the runtime's jrt-fs.jar), stays: the
# launcher and the runtime find those jars in the application folder and nothing else uses them.
set(APP_DIR lib/${PACKAGE_NAME})
set(DOC_DIR share/doc/${PACKAGE_NAME})

install(TARGETS launcher RUNTIME DESTINATION ${APP_DIR} COMPONENT application)
install(FILES ${APPLICATION_JAR} DESTINATION ${APP_DIR} COMPONENT application)
install(DIRECTORY ${APPLICATION_RUNTIME}/ DESTINATION ${APP_DIR}/jre USE_SOURCE_PERMISSIONS COMPONENT application)

# The command: a relative link to the launcher, which finds its folder through /proc/self/exe.
file(MAKE_DIRECTORY ${CMAKE_CURRENT_BINARY_DIR}/bin)
file(CREATE_LINK ../${APP_DIR}/${LAUNCHER_FILE_NAME} ${CMAKE_CURRENT_BINARY_DIR}/bin/${PACKAGE_NAME} SYMBOLIC)
install(FILES ${CMAKE_CURRENT_BINARY_DIR}/bin/${PACKAGE_NAME} DESTINATION bin COMPONENT desktop)

set(DESKTOP_SOURCE ${CMAKE_CURRENT_SOURCE_DIR}/linux)
set(DESKTOP_OUT ${CMAKE_CURRENT_BINARY_DIR}/desktop)
configure_file(${DESKTOP_SOURCE}/app.desktop.in ${DESKTOP_OUT}/${APPLICATION_ID}.desktop @ONLY)
configure_file(${DESKTOP_SOURCE}/mime.xml.in ${DESKTOP_OUT}/${APPLICATION_ID}.xml @ONLY)
configure_file(${DESKTOP_SOURCE}/metainfo.xml.in ${DESKTOP_OUT}/${APPLICATION_ID}.metainfo.xml @ONLY)
configure_file(${DESKTOP_SOURCE}/changelog.in ${DESKTOP_OUT}/changelog @ONLY)
configure_file(${DESKTOP_SOURCE}/manpage.1.in ${DESKTOP_OUT}/${PACKAGE_NAME}.1 @ONLY)
install(FILES ${DESKTOP_OUT}/${APPLICATION_ID}.desktop DESTINATION share/applications COMPONENT desktop)
install(FILES ${DESKTOP_OUT}/${APPLICATION_ID}.xml DESTINATION share/mime/packages COMPONENT desktop)
install(FILES ${DESKTOP_OUT}/${APPLICATION_ID}.metainfo.xml DESTINATION share/metainfo COMPONENT desktop)

# The icons: the program's and its document type's, at every size of the theme's fixed-size folders.
set(ICON_FILES)
foreach(size ${ICON_SIZES})
  list(APPEND ICON_FILES ${ICON_DIR}/app-${size}.png ${ICON_DIR}/document-${size}.png)
  install(FILES ${ICON_DIR}/app-${size}.png DESTINATION share/icons/hicolor/${size}x${size}/apps
    RENAME ${APPLICATION_ID}.png COMPONENT desktop)
  install(FILES ${ICON_DIR}/document-${size}.png DESTINATION share/icons/hicolor/${size}x${size}/mimetypes
    RENAME application-x-${DOCUMENT_EXTENSION}.png COMPONENT desktop)
endforeach()
add_custom_command(OUTPUT ${ICON_FILES}
  COMMAND Python3::Interpreter ${CMAKE_SOURCE_DIR}/launcher/resources/make_icon.py --png ${ICON_DIR} ${ICON_SIZES}
  DEPENDS ${CMAKE_SOURCE_DIR}/launcher/resources/make_icon.py
  COMMENT "Drawing the theme icons")

# Debian wants the changelog and the manual page compressed, reproducibly (no name, no time stamp in
# the gzip header).
foreach(file changelog ${PACKAGE_NAME}.1)
  add_custom_command(OUTPUT ${DESKTOP_OUT}/${file}.gz
    COMMAND gzip -9nfk ${DESKTOP_OUT}/${file}
    DEPENDS ${DESKTOP_OUT}/${file})
endforeach()
add_custom_target(package_files ALL DEPENDS ${ICON_FILES} ${DESKTOP_OUT}/changelog.gz ${DESKTOP_OUT}/${PACKAGE_NAME}.1.gz)
install(FILES ${DESKTOP_SOURCE}/copyright ${DESKTOP_OUT}/changelog.gz DESTINATION ${DOC_DIR} COMPONENT desktop)
install(FILES ${DESKTOP_OUT}/${PACKAGE_NAME}.1.gz DESTINATION share/man/man1 COMPONENT desktop)

# The Debian package. Dependencies: dpkg-shlibdeps finds what the launcher and the runtime link
# (the runtime's own libraries are private, so it is told where they are); what the runtime loads
# with dlopen is named by hand below: fontconfig, which the runtime's font manager loads to find
# fonts, and a font for Swing to draw with. (libX11, which the launcher itself loads when there is a
# display, is linked by the runtime's toolkit and so found anyway.)
set(CPACK_GENERATOR DEB)
set(CPACK_PACKAGE_FILE_NAME ${PACKAGE_NAME}_${PROJECT_VERSION}_amd64)
set(CPACK_PACKAGING_INSTALL_PREFIX /usr)
set(CPACK_DEBIAN_PACKAGE_NAME ${PACKAGE_NAME})
set(CPACK_DEBIAN_PACKAGE_ARCHITECTURE amd64)
set(CPACK_DEBIAN_PACKAGE_SECTION science)
set(CPACK_DEBIAN_PACKAGE_PRIORITY optional)
set(CPACK_DEBIAN_PACKAGE_MAINTAINER ${MAINTAINER})
set(CPACK_DEBIAN_PACKAGE_DESCRIPTION "The QZ-Lumiscope QZ-57 application with its own Java runtime. A QZ-57
document opened from the desktop starts the application with it, or is
handed to the application when it already runs.")
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS ON)
# (dpkg-shlibdeps runs in the package's staging root, so the folders are relative to it)
set(CPACK_DEBIAN_PACKAGE_SHLIBDEPS_PRIVATE_DIRS usr/${APP_DIR}/jre/lib usr/${APP_DIR}/jre/lib/server)
set(CPACK_DEBIAN_PACKAGE_DEPENDS "libfontconfig1, fonts-dejavu-core")
