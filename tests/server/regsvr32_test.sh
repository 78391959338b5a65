#!/usr/bin/env bash
# Registers the built DLL with Wine's regsvr32 and checks the registry with Wine's reg.exe.
# Usage: regsvr32_test.sh <wine-run> <dll> <type library version>; WINEPREFIX names the test prefix.
set -u
run="$1"
dll="Z:$(printf '%s' "$2" | tr / '\\')"
folder='HKCR\CLSID\{7F0C89F4-CE25-42b8-918B-4118CE2CC5DF}'
view='HKCR\CLSID\{05F7AA87-193C-4ece-A11E-0F4C7703DB23}'
namespace='HKLM\Software\Microsoft\Windows\CurrentVersion\Explorer\MyComputer\NameSpace'
approved='HKLM\Software\Microsoft\Windows\CurrentVersion\Shell Extensions\Approved'
level='HKCU\Software\Gravon\Shell Extensions\Marlix DL View\Levels\Station 0'
failures=0

fail() { echo "FAIL: $*"; failures=$((failures + 1)); }
query() { "$run" reg query "$@" 2>/dev/null | tr -d '\r'; }
# expect_line <description> <pattern> <reg query args...>
expect_line() {
  local what="$1" pattern="$2"; shift 2
  query "$@" | grep -qF -- "$pattern" || fail "$what: no line with '$pattern' in reg query $*"
}
# expect_whole_line <description> <line> <reg query args...>: no blank more or less
expect_whole_line() {
  local what="$1" line="$2"; shift 2
  query "$@" | grep -qxF -- "$line" || fail "$what: no line '$line' in reg query $*"
}
expect_key() { "$run" reg query "$1" >/dev/null 2>&1 || fail "key $1 is missing"; }
expect_no_key() { ! "$run" reg query "$1" >/dev/null 2>&1 || fail "key $1 is still there"; }
regsvr() { "$run" regsvr32 /s "$@" "$dll" || fail "regsvr32 $* answered $?"; }

"$run" reg add "$level" /v Name /d "Station 0" /f >/dev/null || fail "cannot seed a level"

regsvr /u
regsvr /u    # nothing registered: still S_OK
expect_no_key "$folder"

regsvr
expect_whole_line "server" "    (Default)    REG_SZ    $dll" "$folder\\InprocServer32" /ve
expect_whole_line "threading" "    ThreadingModel    REG_SZ    Apartment" "$folder\\InprocServer32" /v ThreadingModel
expect_whole_line "icon" "    (Default)    REG_SZ    $dll,0" "$folder\\DefaultIcon" /ve
expect_line "attributes" "Attributes    REG_BINARY    000000A0" "$folder\\ShellFolder" /v Attributes
expect_line "namespace" "Marlix Digital Levels" "$namespace\\{7F0C89F4-CE25-42b8-918B-4118CE2CC5DF}" /ve
expect_line "approved" "Marlix Digital Levels" "$approved" /v "{7F0C89F4-CE25-42b8-918B-4118CE2CC5DF}"
expect_line "progid" "MarlixDLShellExt.MarlixDLShellView.1" "$view\\ProgID" /ve
expect_key "HKCR\\TypeLib\\{1C83F5C4-5B89-4449-87FF-E494222081A6}\\$3"

# A second registration replaces the class keys and writes Attributes anew.
"$run" reg add "$folder\\Leftover" /f >/dev/null
regsvr
expect_no_key "$folder\\Leftover"
expect_line "attributes again" "000000A0" "$folder\\ShellFolder" /v Attributes

regsvr /u
expect_no_key "$folder"
expect_no_key "$view"
expect_no_key "HKCR\\TypeLib\\{1C83F5C4-5B89-4449-87FF-E494222081A6}\\$3"
expect_no_key "$namespace\\{7F0C89F4-CE25-42b8-918B-4118CE2CC5DF}"
expect_key "$namespace"
expect_key "$approved"
query "$approved" | grep -qF '7F0C89F4' && fail "approved value still there"
expect_line "level after unregistering" "Station 0" "$level" /v Name

regsvr
expect_line "level after registering again" "Station 0" "$level" /v Name
regsvr /u
"$run" reg delete "$level" /f >/dev/null 2>&1

if [ "$failures" -ne 0 ]; then echo "$failures failed"; exit 1; fi
echo "regsvr32 registration: all checks passed"
