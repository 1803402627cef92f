#!/usr/bin/env bash
# Runs clang-tidy with the list in .clang-tidy over the code that ships. What did not change since its last clean run, headers
# included, is not looked at again.
#   tidy.sh [BUILD FOLDER]
set -euo pipefail
cd "$(dirname "$0")/../.."
build=${1:-build}
export build
export stamps="$build/tidy"
mkdir -p "$stamps"
[ .clang-tidy -nt "$stamps/list" ] && rm -rf "$stamps" && mkdir -p "$stamps" && touch "$stamps/list"

look_at() {
  file=$1
  stamp="$stamps/${file//\//_}"
  # The compiler's own list of the project's files that this one depends on.
  sum=$({ echo "$file"; g++ -MM -std=c++20 -I. -Itester -Ikyvisa/include -fPIC \
          $(pkg-config --cflags Qt5Widgets 2>/dev/null) "$file" 2>/dev/null | tr ' \\' '\n\n' | grep -E '\.(h|cpp)$'; } |
        sort -u | xargs cat 2>/dev/null | sha256sum)
  [ "$(cat "$stamp" 2>/dev/null)" = "$sum" ] && return 0
  if out=$(clang-tidy --quiet -p "$build" "$file" 2>/dev/null); then echo "$sum" >"$stamp"; else printf '%s\n' "$out"; return 1; fi
}
export -f look_at

git ls-files -- 'wire/*.cpp' 'kyvisa/*.cpp' 'simulator/*.cpp' 'tester/*.cpp' |
  xargs -P "$(nproc)" -I{} bash -c 'look_at {}' && echo "clang-tidy: nothing found"
