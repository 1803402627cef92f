# What the scripts share: package check, configuring and building through the CMake presets. Sourced, not run.

project=$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)
cd "$project"

say() { printf '== %s\n' "$*"; }
fail() { printf '%s: %s\n' "$(basename "$0")" "$*" >&2; exit 1; }

# Prints the packages of the given kinds ("build", "test") that the list names.
packages_of() {
  local kinds=" $* "
  while read -r kind name; do
    case $kind in ''|'#'*) continue ;; esac
    case $kinds in *" $kind "*) printf '%s\n' "$name" ;; esac
  done < scripts/packages.txt
}

# Installs what is missing of the given kinds. Quick and silent when nothing is.
need_packages() {
  local wanted missing=() name
  mapfile -t wanted < <(packages_of "$@")
  if ! command -v dpkg-query >/dev/null || ! command -v apt-get >/dev/null; then
    [ -e build/packages-are-there ] && return 0
    printf 'This is not a Debian system. These packages of Debian 12, or their like, are needed:\n' >&2
    printf '  %s\n' "${wanted[@]}" >&2
    printf 'When they are there: mkdir -p build && touch build/packages-are-there, then run this again.\n' >&2
    exit 1
  fi
  local installed
  # dpkg-query fails when it does not know one of them; what it does know is all that counts.
  installed=$({ dpkg-query -W -f '${db:Status-Status} ${Package}\n' "${wanted[@]}" 2>/dev/null || true; } | awk '$1 == "installed" {print $2}')
  for name in "${wanted[@]}"; do
    grep -qx -- "$name" <<<"$installed" || missing+=("$name")
  done
  [ ${#missing[@]} -eq 0 ] && return 0
  local become=()
  if [ "$(id -u)" != 0 ]; then
    command -v sudo >/dev/null || fail "these packages are missing, and there is neither root nor sudo to install them: ${missing[*]}"
    become=(sudo)
  fi
  say "installing ${#missing[@]} packages: ${missing[*]}"
  local log
  log=$(mktemp)
  # The package lists of a fresh machine are empty or old; tshark asks a question unless told not to.
  if ! { "${become[@]}" env DEBIAN_FRONTEND=noninteractive apt-get update -qq &&
         "${become[@]}" env DEBIAN_FRONTEND=noninteractive apt-get install -y -qq --no-install-recommends "${missing[@]}"; } >"$log" 2>&1; then
    tail -n 20 "$log" >&2
    rm -f "$log"
    fail "installing the packages failed"
  fi
  rm -f "$log"
}

# Unpacks the packages of kind "unpack" into build/unpacked, once. For their programs alone: nothing of them is installed or started.
unpack_packages() {
  local name folder
  command -v apt-get >/dev/null || return 0
  for name in $(packages_of unpack); do
    [ -e "build/unpacked/$name" ] && continue
    say "unpacking $name"
    folder=$(mktemp -d)
    # _apt cannot write into a folder of ours; apt-get says so and goes on as who we are.
    (cd "$folder" && apt-get download -qq "$name" >/dev/null 2>&1) || fail "downloading $name failed"
    mkdir -p build/unpacked
    dpkg -x "$folder/$name"_*.deb build/unpacked
    touch "build/unpacked/$name"
    rm -rf "$folder"
  done
}

# Configures and builds a preset; further arguments are targets. The tests need packages that the programs do not: with
# targets given, a folder that is new is configured without them.
build_preset() {
  local preset=$1 folder
  shift
  case $preset in default) folder=build ;; *) folder=build/$preset ;; esac
  if [ $# -eq 0 ]; then
    case $preset in default) cmake --preset "$preset" -DKYVISA_BUILD_TESTS=ON >/dev/null ;; *) cmake --preset "$preset" >/dev/null ;; esac
  elif [ ! -e "$folder/build.ninja" ]; then
    cmake --preset "$preset" -DKYVISA_BUILD_TESTS=OFF >/dev/null
  fi
  if [ $# -gt 0 ]; then cmake --build "$folder" --target "$@"; else cmake --build "$folder"; fi
}
