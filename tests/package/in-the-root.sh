#!/bin/bash
# What scripts/checks/packages-in-a-root runs inside its Debian root: /packages has the packages, /proof/package this folder.
set -euo pipefail
say() { printf '== %s\n' "$*"; }
fail() { printf 'packages: %s\n' "$*" >&2; exit 1; }
# await SECONDS COMMAND...: until it succeeds.
await() {
  local end=$((SECONDS + $1))
  shift
  until "$@"; do
    [ $SECONDS -lt $end ] || return 1
    sleep 0.1
  done
}
files() { find / -xdev \( -path /tmp -o -path /proc -o -path /dev -o -path /proof -o -path /packages \) -prune -o -print | sort; }
mkdir -p "$HOME/Documents"
apt() { apt-get -qq -y --no-install-recommends -o Dpkg::Use-Pty=0 "$@" >/tmp/apt.log 2>&1 || { tail -n 20 /tmp/apt.log >&2; fail "apt-get $*"; }; }

cd /packages
names=$(for file in *.deb; do dpkg-deb -f "$file" Package; done)

# With the network of the machine: what the packages depend on, so that it shows later what is theirs, and what is needed to try them.
prepare() {
  local depends before
  depends=$(for file in *.deb; do dpkg-deb -f "$file" Depends | tr ',' '\n' | sed 's/^ *//' | grep -vE '^(libkyvisa|kyvisa)' || true; done | sort -u | paste -sd,)
  say "dependencies: $depends"
  apt update
  apt satisfy "$depends"
  before=$(dpkg-query -f '.\n' -W | wc -l)
  apt install gcc libc6-dev cmake make pkg-config python3-pyvisa xvfb xdotool iproute2 man-db desktop-file-utils
  say "$before packages with the dependencies, $(dpkg-query -f '.\n' -W | wc -l) with the tools that try them"
}

# The rest has a network of its own: ports of instruments are free there, and nobody else is found.
if [ "${1:-}" != prepared ]; then
  prepare
  exec unshare --net "$0" prepared
fi
ip link set lo up
# What the system keeps of all packages, it keeps from the beginning.
ldconfig
mandb --quiet
files >/tmp/before

say "installing $(echo $names)"
# Nothing but the packages themselves: their dependencies are complete, or this fails.
dpkg -i ./*.deb >/tmp/dpkg.log 2>&1 || { cat /tmp/dpkg.log >&2; fail "dpkg -i"; }
files >/tmp/with
dpkg -V $names || fail "the installed files are not those of the packages"
[ "$(comm -13 /tmp/before /tmp/with | grep -c '^/usr/bin/')" = 2 ] || fail "not two programs"
ldconfig -p >/tmp/linker && grep -q 'libkyvisa\.so ' /tmp/linker || fail "the linker does not know the library"
for program in KyVisaTester KyVisaSimulator; do
  if ldd /usr/bin/$program | grep 'not found'; then fail "$program lacks a library"; fi
done
# In another width than usual: what man has rendered in the usual one, it keeps.
for page in KyVisaTester KyVisaSimulator libkyvisa kyvisa.ini; do
  MANWIDTH=100 man "$page" >/tmp/page && grep -q "^NAME" /tmp/page || fail "no manual page of $page"
done
desktop-file-validate /usr/share/applications/example.oltrava.KyVisaTester.desktop

say "the simulator serves"
KyVisaSimulator --profile multimeter --log --hislip 4880 --socket 5025 --vxi11 0 --serial >/tmp/simulator 2>/tmp/simulator.errors &
simulator=$!
await 60 grep -qx ready /tmp/simulator || fail "the simulator: $(cat /tmp/simulator /tmp/simulator.errors)"
sed '/^ready$/,$d; s/^/   /' /tmp/simulator
identification='Oltrava,MM-6510,'

say "C, by pkg-config and by CMake"
mkdir /tmp/build
for source in /usr/share/doc/libkyvisa-dev/examples/*.c /proof/package/consumer/query.c; do
  cc -std=c99 -Wall -Wextra -Werror "$source" -o "/tmp/build/$(basename "$source" .c)" $(pkg-config --cflags --libs kyvisa)
  echo "   compiled $(basename "$source")"
done
cmake -S /proof/package/consumer -B /tmp/build/cmake >/tmp/cmake.log && cmake --build /tmp/build/cmake >>/tmp/cmake.log || { cat /tmp/cmake.log; fail "CMake"; }
for program in /tmp/build/query /tmp/build/cmake/query; do
  for resource in TCPIP::localhost::hislip0::INSTR TCPIP::localhost::inst0::INSTR TCPIP::localhost::5025::SOCKET "$(awk '$1 == "serial" { print $NF }' /tmp/simulator)"; do
    answer=$("$program" "$resource") || fail "$program $resource"
    [[ $answer == "$identification"* ]] || fail "$program $resource says $answer"
    echo "   $resource: $answer"
  done
done
[ "$(ldd /tmp/build/query | awk '$1 == "libkyvisa.so" { print $3 }')" -ef "$(dpkg -L libkyvisa | grep '\.so$')" ] || fail "query uses another library"

say "Python, by PyVISA"
python3 - <<'END'
import pyvisa

manager = pyvisa.ResourceManager("libkyvisa.so")
with manager.open_resource("TCPIP::localhost::hislip0::INSTR") as instrument:
    answer = instrument.query("*IDN?")
assert answer.startswith("Oltrava,MM-6510,"), answer
print("  ", manager.visalib.library_path, answer.strip())
END

say "the tester opens its window on the installed library, connects to the simulator and asks"
/proof/package/installed.py tester / /usr
/proof/package/installed.py session / /usr | sed 's/^/   /'

say "and offscreen, without a display"
QT_QPA_PLATFORM=offscreen KyVisaTester >/tmp/tester 2>&1 &
tester=$!
# The library is asked for its name by the worker as soon as the window stands.
await 60 grep -q 'libkyvisa\.so' /proc/$tester/maps || fail "the tester does not start offscreen: $(cat /tmp/tester)"
await 60 test -d "$HOME/Documents/KyVisaTester" || fail "no log folder of the tester: its window does not come up"
kill -0 $tester || fail "the tester ended: $(cat /tmp/tester)"
kill $tester
wait $tester || true

kill $simulator
wait $simulator || fail "the simulator ends with status $?"

say "removing"
dpkg --purge $names >/tmp/dpkg.log 2>&1 || { cat /tmp/dpkg.log >&2; fail "dpkg --purge"; }
files >/tmp/after
if ! comm -13 /tmp/before /tmp/after >/tmp/left || [ -s /tmp/left ]; then
  cat /tmp/left >&2
  fail "these are left"
fi
comm -23 /tmp/before /tmp/after >/tmp/gone
[ ! -s /tmp/gone ] || { cat /tmp/gone >&2; fail "these are gone"; }
ldconfig -p >/tmp/linker
if grep libkyvisa /tmp/linker; then fail "the linker still knows the library"; fi
say "$(comm -13 /tmp/before /tmp/with | wc -l) files and folders came, and all of them went"
