; The installer of the Marlix Digital Levels shell extension.
;   makensis -DVERSION=<x.y.z> -DMODULE=<MarlixDLShellExt.dll> -DSTANDIN=<MarlixComm.dll>
;            -DOUTFILE=<installer.exe> [-DTARGET=amd64-unicode] MarlixDLShellExt.nsi
; Installer command line: /S silent, /PRACTICE adds the practice instrument, /D=<folder> last.
!ifdef TARGET
  Target ${TARGET}
!else
  ; A 32-bit installer runs everywhere, so that a 32-bit Windows hears why it can't have the module.
  Unicode true
!endif

!include MUI2.nsh
!include LogicLib.nsh
!include x64.nsh
!include FileFunc.nsh

!define PRODUCT "Marlix Digital Levels"
!define MODULE_NAME "MarlixDLShellExt.dll"
!define UNINSTALL_KEY "Software\Microsoft\Windows\CurrentVersion\Uninstall\MarlixDLShellExt"
!define REGSVR32 '"$WINDIR\System32\regsvr32.exe" /s'

Name "${PRODUCT}"
Caption "${PRODUCT} ${VERSION} Setup"
OutFile "${OUTFILE}"
InstallDir "$PROGRAMFILES64\${PRODUCT}"
RequestExecutionLevel admin
SetCompressor /SOLID lzma
BrandingText "${PRODUCT} ${VERSION}"
VIProductVersion "${VERSION}.0"
VIAddVersionKey /LANG=1033 ProductName "${PRODUCT}"
VIAddVersionKey /LANG=1033 ProductVersion "${VERSION}"
VIAddVersionKey /LANG=1033 FileVersion "${VERSION}"
VIAddVersionKey /LANG=1033 FileDescription "${PRODUCT} ${VERSION} Setup"
VIAddVersionKey /LANG=1033 LegalCopyright "Gravon"

!define MUI_ABORTWARNING
!define MUI_COMPONENTSPAGE_SMALLDESC
!insertmacro MUI_PAGE_COMPONENTS
!insertmacro MUI_PAGE_DIRECTORY
!insertmacro MUI_PAGE_INSTFILES
!define MUI_FINISHPAGE_TEXT "${PRODUCT} now appears under Computer in Windows Explorer and in every Open and Save dialog.$\r$\n$\r$\nOpen it and choose Add New Digital Level to describe your instrument."
!insertmacro MUI_PAGE_FINISH
!insertmacro MUI_UNPAGE_CONFIRM
!insertmacro MUI_UNPAGE_INSTFILES
!insertmacro MUI_LANGUAGE English

; Runs the system's 64-bit regsvr32, even from a 32-bit installer, and leaves its code in $0.
!macro RunRegsvr32 ARGS
  ${DisableX64FSRedirection}
  ExecWait '${REGSVR32} ${ARGS}' $0
  ${EnableX64FSRedirection}
!macroend

Section "${PRODUCT}" SecModule
  SectionIn RO
  SetOutPath "$INSTDIR"
  ; Explorer keeps a module it has loaded open: it can't be overwritten, but it can be moved aside.
  ${If} ${FileExists} "$INSTDIR\${MODULE_NAME}"
    Delete "$INSTDIR\${MODULE_NAME}.old"
    Rename "$INSTDIR\${MODULE_NAME}" "$INSTDIR\${MODULE_NAME}.old"
    Delete /REBOOTOK "$INSTDIR\${MODULE_NAME}.old"
  ${EndIf}
  File "/oname=${MODULE_NAME}" "${MODULE}"
  WriteUninstaller "$INSTDIR\Uninstall.exe"
  !insertmacro RunRegsvr32 '"$INSTDIR\${MODULE_NAME}"'
  ${If} $0 != 0
    MessageBox MB_OK|MB_ICONSTOP "${PRODUCT} could not be registered (regsvr32 answered $0)." /SD IDOK
    SetErrorLevel 3
    Abort
  ${EndIf}
  WriteRegStr HKLM "${UNINSTALL_KEY}" "DisplayName" "${PRODUCT}"
  WriteRegStr HKLM "${UNINSTALL_KEY}" "DisplayVersion" "${VERSION}"
  WriteRegStr HKLM "${UNINSTALL_KEY}" "Publisher" "Gravon"
  WriteRegStr HKLM "${UNINSTALL_KEY}" "DisplayIcon" "$INSTDIR\${MODULE_NAME},0"
  WriteRegStr HKLM "${UNINSTALL_KEY}" "InstallLocation" "$INSTDIR"
  WriteRegStr HKLM "${UNINSTALL_KEY}" "UninstallString" '"$INSTDIR\Uninstall.exe"'
  WriteRegStr HKLM "${UNINSTALL_KEY}" "QuietUninstallString" '"$INSTDIR\Uninstall.exe" /S'
  WriteRegDWORD HKLM "${UNINSTALL_KEY}" "NoModify" 1
  WriteRegDWORD HKLM "${UNINSTALL_KEY}" "NoRepair" 1
  ${GetSize} "$INSTDIR" "/S=0K" $1 $2 $3
  WriteRegDWORD HKLM "${UNINSTALL_KEY}" "EstimatedSize" $1
SectionEnd

; The instrument's maker ships the real MarlixComm.dll. A MarlixComm.dll that this installer
; did not put there is theirs and stays untouched, in an upgrade as in the uninstall.
Section /o "Practice instrument" SecPractice
  ReadRegDWORD $1 HKLM "${UNINSTALL_KEY}" "PracticeInstrument"
  ${If} ${FileExists} "$INSTDIR\MarlixComm.dll"
  ${AndIf} $1 != 1
    DetailPrint "MarlixComm.dll of the instrument's maker is installed: the practice instrument is left out."
    Return
  ${EndIf}
  SetOutPath "$INSTDIR"
  File "/oname=MarlixComm.dll" "${STANDIN}"
  WriteRegDWORD HKLM "${UNINSTALL_KEY}" "PracticeInstrument" 1
SectionEnd

!insertmacro MUI_FUNCTION_DESCRIPTION_BEGIN
  !insertmacro MUI_DESCRIPTION_TEXT ${SecModule} "The Marlix Digital Levels folder under Computer, from which jobs are downloaded from your levels."
  !insertmacro MUI_DESCRIPTION_TEXT ${SecPractice} "A simulated level for trying a download without an instrument: it sends a made-up job. It is not the instrument maker's MarlixComm.dll and is never installed over it."
!insertmacro MUI_FUNCTION_DESCRIPTION_END

Function .onInit
  ${IfNot} ${RunningX64}
    MessageBox MB_OK|MB_ICONSTOP "${PRODUCT} needs a 64-bit edition of Windows. This computer runs a 32-bit edition, so nothing was installed." /SD IDOK
    SetErrorLevel 2
    Quit
  ${EndIf}
  SetRegView 64
  ; An upgrade goes where the first installation went, unless /D names a folder.
  ReadRegStr $0 HKLM "${UNINSTALL_KEY}" "InstallLocation"
  ${If} $0 != ""
  ${AndIf} $INSTDIR == "$PROGRAMFILES64\${PRODUCT}"
    StrCpy $INSTDIR $0
  ${EndIf}
  ${GetParameters} $0
  ClearErrors
  ${GetOptions} $0 "/PRACTICE" $1
  ${IfNot} ${Errors}
    !insertmacro SelectSection ${SecPractice}
  ${EndIf}
FunctionEnd

Function un.onInit
  SetRegView 64
FunctionEnd

; The levels in the user's registry stay: they come back with the next installation.
Section "Uninstall"
  !insertmacro RunRegsvr32 '/u "$INSTDIR\${MODULE_NAME}"'
  Delete /REBOOTOK "$INSTDIR\${MODULE_NAME}"
  Delete "$INSTDIR\${MODULE_NAME}.old"
  ReadRegDWORD $1 HKLM "${UNINSTALL_KEY}" "PracticeInstrument"
  ${If} $1 == 1
    Delete /REBOOTOK "$INSTDIR\MarlixComm.dll"
    Delete "$INSTDIR\MarlixComm.log"  ; the practice instrument's record of its calls
  ${EndIf}
  Delete "$INSTDIR\Uninstall.exe"
  RMDir "$INSTDIR"
  DeleteRegKey HKLM "${UNINSTALL_KEY}"
SectionEnd
