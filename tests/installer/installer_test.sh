#!/usr/bin/env bash
# The installer under Wine, in a fresh prefix: silent install, shell32 reaching the folder,
# upgrade, practice instrument, uninstall, and a maker's MarlixComm.dll never overwritten.
# With the practice instrument installed, the whole road of one download runs on the product.
# Usage: installer_test.sh <installer> <shell probe> <stand-in dll> <version> <prefix>
#                          <download road> <shell peer> <road folder>
set -u
installer="$1" probe="$2" standin="$3" version="$4" road="$6" peer="$7" road_dir="$8"
root=$(cd "$(dirname "$0")/../.." && pwd)
export WINEPREFIX="$5" WINEDEBUG=-all
rm -rf "$WINEPREFIX"
"$root/scripts/wine-prefix" "$WINEPREFIX" || exit 1
target="$WINEPREFIX/drive_c/Program Files/Marlix Digital Levels"
uninstall_key='HKLM\Software\Microsoft\Windows\CurrentVersion\Uninstall'
folder_key='HKCR\CLSID\{7F0C89F4-CE25-42b8-918B-4118CE2CC5DF}'
level='HKCU\Software\Gravon\Shell Extensions\Marlix DL View\Levels\Station 0'
failures=0

fail() { echo "FAIL: $*"; failures=$((failures + 1)); }
run() { "$root/scripts/wine-run" "$@"; }
query() { run reg query "$@" 2>/dev/null | tr -d '\r'; }
exists() { run reg query "$1" >/dev/null 2>&1; }
install() { run "$installer" /S "$@" || fail "installer $* answered $?"; }
# The uninstaller goes on in a copy of itself, whose last step removes the Add/Remove entry.
uninstall() {
  run "C:\\Program Files\\Marlix Digital Levels\\Uninstall.exe" /S || fail "uninstaller answered $?"
  for _ in $(seq 100); do exists "$uninstall_key\\MarlixDLShellExt" || return 0; sleep 0.1; done
  fail "Add/Remove entry left behind"
}
# count <pattern> <text>: how many lines of the text hold the pattern
count() { printf '%s\n' "$2" | grep -cF -- "$1"; }
expect_count() { [ "$2" -eq "$3" ] || fail "$1: $2, expected $3"; }

run reg add "$level" /v Name /d "North Site" /f >/dev/null || fail "cannot seed a level"

install
[ -f "$target/MarlixDLShellExt.dll" ] || fail "module not installed"
[ -f "$target/Uninstall.exe" ] || fail "uninstaller not written"
[ -e "$target/MarlixComm.dll" ] && fail "practice instrument installed without being chosen"
shell=$(run "$probe" | tr -d '\r') || fail "shell32 cannot bind to the folder"
expect_count "folder under My Computer" "$(count 'computer: Marlix Digital Levels' "$shell")" 1
expect_count "level seen through shell32" "$(count 'level: North Site' "$shell")" 1
query "$uninstall_key\\MarlixDLShellExt" /v DisplayVersion | grep -qF "$version" || fail "Add/Remove entry has no version $version"

# Upgrade, now with the practice instrument: still one registration and one Add/Remove entry.
install /PRACTICE
cmp -s "$standin" "$target/MarlixComm.dll" || fail "practice instrument not installed when chosen"
shell=$(run "$probe" | tr -d '\r')
expect_count "folder under My Computer after an upgrade" "$(count 'computer: Marlix Digital Levels' "$shell")" 1
expect_count "Add/Remove entries after an upgrade" "$(query "$uninstall_key" /s | grep -c 'DisplayName.*Marlix Digital Levels')" 1
query "$folder_key\\InprocServer32" /ve | grep -qF 'C:\Program Files\Marlix Digital Levels\MarlixDLShellExt.dll' ||
  fail "the registration does not name the installed module"

# The road: the add row, the sheet, the new level, its file dragged to another program and
# downloaded from the practice instrument; a picture of the screen after each step.
windows() { printf 'Z:%s' "${1//\//\\}"; }
rm -rf "$road_dir"
mkdir -p "$road_dir/received" "$road_dir/screens"
# The road runs with the diagnostic log switched on as README tells a support person to.
view_key='HKCU\Software\Gravon\Shell Extensions\Marlix DL View'
run reg add "$view_key" /v "Diagnostic Log" /t REG_DWORD /d 1 /f >/dev/null || fail "cannot switch the log on"
start=$(date +%s)
run "$road" "$(windows "$peer")" "$(windows "$road_dir/received")" "$(windows "$road_dir/screens")" ||
  fail "the download road"
echo "the download road took $(( $(date +%s) - start )) s"
run reg delete "$view_key" /v "Diagnostic Log" /f >/dev/null
# The road's own process writes the download; each new process deletes older logs it can.
road_log=$(find "$WINEPREFIX/drive_c/users" -name 'MarlixDLShellExt_*.log' -exec grep -l "Download: Start pressed" {} + | head -1)
if [ -z "$road_log" ]; then
  fail "no diagnostic log tells of the download"
else
  cp "$road_log" "$road_dir/download.log"
  grep -q "ReceiveFile answered 0" "$road_log" || fail "the log has no answer of the instrument to ReceiveFile"
  grep -q "transfer ended with 0" "$road_log" || fail "the log has no end of the transfer"
fi
for shot in "$road_dir"/screens/*.bmp; do /usr/bin/convert "$shot" "${shot%.bmp}.png" && rm "$shot"; done

uninstall
[ -e "$target" ] && fail "files left behind: $(ls "$target")"
exists "$folder_key" && fail "registration left behind"
query "$level" /v Name | grep -qF "North Site" || fail "the user's level is gone"

# A MarlixComm.dll of the instrument's maker is never overwritten nor removed.
mkdir -p "$target"
printf 'the maker' > "$target/MarlixComm.dll"
install /PRACTICE
uninstall
[ "$(cat "$target/MarlixComm.dll" 2>/dev/null)" = "the maker" ] || fail "the maker's MarlixComm.dll was replaced or removed"

if [ "$failures" -ne 0 ]; then echo "$failures failed"; exit 1; fi
echo "installer: all checks passed"
