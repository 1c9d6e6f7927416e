# Windows: the application folder as installed under %ProgramFiles%, and an NSIS installer per
# architecture (Unicode; the x86_64 one on the 64-bit stub, so it runs where 32-bit programs
# cannot). The installer registers the .qz57 document type, a Start menu shortcut and an entry in the
# installed programs; its uninstaller takes exactly that away again.
if(CMAKE_SIZEOF_VOID_P EQUAL 8)
  set(INSTALLER_ARCH x86_64)
  set(INSTALLER_TARGET amd64-unicode)
  set(CPACK_NSIS_INSTALL_ROOT "$PROGRAMFILES64")
else()
  set(INSTALLER_ARCH i686)
  set(INSTALLER_TARGET x86-unicode)
  set(CPACK_NSIS_INSTALL_ROOT "$PROGRAMFILES")
endif()
set(LAUNCHER_EXE ${LAUNCHER_FILE_NAME}.exe)

install(TARGETS launcher RUNTIME DESTINATION . COMPONENT application)
install(FILES ${APPLICATION_JAR} DESTINATION . COMPONENT application)

# No Windows Java runtime can be made here. One given at build time is copied as jre\; without one
# the folder holds the test stand-in, the VM double of the scenario table, which records what the
# launcher hands it in vm-record.txt and lets main run as long as vm-script.txt says.
set(WINDOWS_JRE "" CACHE PATH "A Windows Java runtime to install as jre\\ (empty: the test stand-in)")
if(WINDOWS_JRE)
  if(NOT EXISTS ${WINDOWS_JRE}/bin/client/jvm.dll)
    message(FATAL_ERROR "WINDOWS_JRE=${WINDOWS_JRE} holds no bin/client/jvm.dll")
  endif()
  install(DIRECTORY ${WINDOWS_JRE}/ DESTINATION jre USE_SOURCE_PERMISSIONS COMPONENT application)
  set(RUNTIME_NOTE "It carries the Java runtime given when it was built.")
else()
  if(NOT TARGET vmdouble)
    message(FATAL_ERROR "Without WINDOWS_JRE the application folder takes the test stand-in: configure with LAUNCHER_TESTS=ON")
  endif()
  install(FILES $<TARGET_FILE:vmdouble> DESTINATION jre/bin/client COMPONENT application)
  configure_file(windows/stand-in-README.txt ${CMAKE_CURRENT_BINARY_DIR}/stand-in/README.txt NEWLINE_STYLE WIN32)
  install(FILES ${CMAKE_CURRENT_BINARY_DIR}/stand-in/README.txt DESTINATION jre COMPONENT application)
  file(WRITE ${CMAKE_CURRENT_BINARY_DIR}/stand-in/vm-script.txt "main_ms=3000\n")
  install(FILES ${CMAKE_CURRENT_BINARY_DIR}/stand-in/vm-script.txt DESTINATION . COMPONENT application)
  set(RUNTIME_NOTE "It carries a TEST STAND-IN instead of a Java runtime: the application does not run, the stand-in only records what the launcher hands it. Build with WINDOWS_JRE=DIR for a real runtime.")
endif()

# The installer. CPack's NSIS script takes our pieces at its hooks: the character set and target
# first, the welcome page's text, and the registration in the install and uninstall sections
# (packaging/windows/register.nsh).
configure_file(windows/register.nsh ${CMAKE_CURRENT_BINARY_DIR}/register.nsh @ONLY)
set(CPACK_GENERATOR NSIS)
set(CPACK_PACKAGE_FILE_NAME "QZ-Lumiscope_QZ-57-${PROJECT_VERSION}-setup-${INSTALLER_ARCH}")
set(CPACK_PACKAGE_INSTALL_DIRECTORY "${PRODUCT_NAME}")
set(CPACK_PACKAGE_INSTALL_REGISTRY_KEY "${PRODUCT_NAME}")
set(CPACK_NSIS_PACKAGE_NAME "${PRODUCT_NAME}")
set(CPACK_NSIS_DISPLAY_NAME "${PRODUCT_NAME}")
set(CPACK_NSIS_INSTALLED_ICON_NAME "${LAUNCHER_EXE}")
set(CPACK_NSIS_MUI_ICON ${CMAKE_BINARY_DIR}/launcher/launcher.ico)
set(CPACK_NSIS_MUI_UNIICON ${CMAKE_BINARY_DIR}/launcher/launcher.ico)
set(CPACK_PACKAGE_EXECUTABLES "${LAUNCHER_FILE_NAME}" "${PRODUCT_NAME}")
set(CPACK_NSIS_EXECUTABLES_DIRECTORY ".")
set(CPACK_NSIS_UNINSTALL_NAME "Uninstall")
set(CPACK_NSIS_ENABLE_UNINSTALL_BEFORE_INSTALL ON)  # installing over an installation upgrades it
set(CPACK_NSIS_DEFINES "Target ${INSTALLER_TARGET}
!define MUI_WELCOMEPAGE_TEXT \"This installs ${PRODUCT_NAME} ${PROJECT_VERSION} for every user of this computer.$\\r$\\n$\\r$\\n${RUNTIME_NOTE}\"
!include \"${CMAKE_CURRENT_BINARY_DIR}/register.nsh\"")
set(CPACK_NSIS_EXTRA_INSTALL_COMMANDS "!insertmacro RegisterApplication")
set(CPACK_NSIS_EXTRA_UNINSTALL_COMMANDS "!insertmacro UnregisterApplication")
