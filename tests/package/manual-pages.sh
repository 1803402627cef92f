#!/usr/bin/env bash
# Every manual page renders without a warning of either formatter, and has the name line that apropos needs.
# Usage: manual-pages.sh FOLDER
set -euo pipefail
cd "$1"
shopt -s nullglob
pages=(*.[1-8])
[ ${#pages[@]} -gt 0 ] || { echo "no manual page in $1"; exit 1; }
status=0
for page in "${pages[@]}"; do
  said=$({ mandoc -T lint -W warning "$page" || true
           LC_ALL=C.UTF-8 MANWIDTH=80 man --warnings --encoding=UTF-8 --local-file --troff-device=utf8 --ditroff "./$page" 2>&1 >/dev/null
           lexgrog "$page" | grep -F "\"${page%.*} - " >/dev/null || echo "$page: its name line does not begin with ${page%.*}"; } 2>&1)
  [ -z "$said" ] || { printf '%s\n' "$said"; status=1; }
done
[ $status = 0 ] && echo "${#pages[@]} pages, nothing to say"
exit $status
