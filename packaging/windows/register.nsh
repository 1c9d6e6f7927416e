; What the installer registers beside the files, and what the uninstaller takes away again: the
; document type (.@DOCUMENT_EXTENSION@ opened by the launcher through a program id of our own, per
; machine) and the entries of the installed programs that CPack's own script leaves out. The shell
; is told afterwards, so Explorer shows the new icon and verb at once.
!include "FileFunc.nsh"

!define PROGRAM_ID "QZLumiscope.QZ57Document"
!define DOCUMENT_KEY "Software\Classes\.@DOCUMENT_EXTENSION@"
!define PROGRAM_KEY "Software\Classes\${PROGRAM_ID}"
!define UNINSTALL_KEY "Software\Microsoft\Windows\CurrentVersion\Uninstall\@PRODUCT_NAME@"
!define VENDOR_KEY "Software\@PUBLISHER@"
!define SHCNE_ASSOCCHANGED 0x08000000

!macro RegisterApplication
  WriteRegStr HKLM "${DOCUMENT_KEY}" "" "${PROGRAM_ID}"
  WriteRegStr HKLM "${DOCUMENT_KEY}\OpenWithProgids" "${PROGRAM_ID}" ""
  WriteRegStr HKLM "${PROGRAM_KEY}" "" "@PRODUCT_NAME@ document"
  WriteRegStr HKLM "${PROGRAM_KEY}\DefaultIcon" "" "$INSTDIR\@LAUNCHER_EXE@,0"
  WriteRegStr HKLM "${PROGRAM_KEY}\shell\open\command" "" '"$INSTDIR\@LAUNCHER_EXE@" "%1"'

  ; Windows reads these two as numbers.
  WriteRegDWORD SHCTX "${UNINSTALL_KEY}" "NoModify" 1
  WriteRegDWORD SHCTX "${UNINSTALL_KEY}" "NoRepair" 1
  WriteRegStr SHCTX "${UNINSTALL_KEY}" "InstallLocation" "$INSTDIR"
  WriteRegStr SHCTX "${UNINSTALL_KEY}" "QuietUninstallString" '"$INSTDIR\Uninstall.exe" /S'
  ${GetSize} "$INSTDIR" "/S=0K" $0 $1 $2
  WriteRegDWORD SHCTX "${UNINSTALL_KEY}" "EstimatedSize" $0

  System::Call 'shell32::SHChangeNotify(i ${SHCNE_ASSOCCHANGED}, i 0, p 0, p 0)'
!macroend

; The extension is another program's once it points elsewhere: then only our own traces go.
!macro UnregisterApplication
  DeleteRegKey HKLM "${PROGRAM_KEY}"
  DeleteRegValue HKLM "${DOCUMENT_KEY}\OpenWithProgids" "${PROGRAM_ID}"
  DeleteRegKey /ifempty HKLM "${DOCUMENT_KEY}\OpenWithProgids"
  ReadRegStr $0 HKLM "${DOCUMENT_KEY}" ""
  StrCmp $0 "${PROGRAM_ID}" 0 +2
    DeleteRegValue HKLM "${DOCUMENT_KEY}" ""
  DeleteRegKey /ifempty HKLM "${DOCUMENT_KEY}"
  ; The folder's record under the publisher's key, and that key when nothing else of ours is left.
  DeleteRegKey SHCTX "${VENDOR_KEY}\@PRODUCT_NAME@"
  DeleteRegKey /ifempty SHCTX "${VENDOR_KEY}"

  System::Call 'shell32::SHChangeNotify(i ${SHCNE_ASSOCCHANGED}, i 0, p 0, p 0)'
!macroend
