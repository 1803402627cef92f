#!/usr/bin/env bash
# Checks that every source is formatted as .clang-format says. Status 1 and the places when one is not.
set -euo pipefail
cd "$(dirname "$0")/../.."
git ls-files -z --cached --others --exclude-standard -- '*.h' '*.cpp' '*.c' | xargs -0 clang-format --dry-run -Werror
