#!/usr/bin/env bash
# Has what starts the document browser from a desktop checked: check-desktop.sh FOLDER
set -euo pipefail

for command in desktop-file-validate appstreamcli; do
    if ! command -v "$command" >/dev/null; then
        printf 'check-desktop.sh: Skipped\nthere is no %s here\n\n[  SKIPPED ] Packaging.desktop\n' "$command"
        [[ ${MARROWDALE_TEST_NO_SKIP-} != 1 ]]
        exit
    fi
done
entry=$1/org.marrowdale.Browser.desktop
desktop-file-validate "$entry"
appstreamcli validate --no-net "$1/org.marrowdale.Browser.metainfo.xml"
grep -qx 'Exec=marrowdale browse' "$entry"
