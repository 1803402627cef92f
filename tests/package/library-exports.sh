#!/bin/sh
# The library exports the names of the VISA C interface, no other and none less, and is called libkyvisa.so.
# Usage: library-exports.sh LIBRARY
set -eu
library=$1
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

sort >"$work/expected" <<'NAMES'
viAssertIntrSignal
viAssertTrigger
viAssertUtilSignal
viBufRead
viBufWrite
viClear
viClose
viDisableEvent
viDiscardEvents
viEnableEvent
viFindNext
viFindRsrc
viFlush
viGetAttribute
viGetDefaultRM
viGpibCommand
viGpibControlATN
viGpibControlREN
viGpibPassControl
viGpibSendIFC
viIn16
viIn16Ex
viIn32
viIn32Ex
viIn64
viIn64Ex
viIn8
viIn8Ex
viInstallHandler
viLock
viMapAddress
viMapAddressEx
viMapTrigger
viMemAlloc
viMemAllocEx
viMemFree
viMemFreeEx
viMove
viMoveAsync
viMoveAsyncEx
viMoveEx
viMoveIn16
viMoveIn16Ex
viMoveIn32
viMoveIn32Ex
viMoveIn64
viMoveIn64Ex
viMoveIn8
viMoveIn8Ex
viMoveOut16
viMoveOut16Ex
viMoveOut32
viMoveOut32Ex
viMoveOut64
viMoveOut64Ex
viMoveOut8
viMoveOut8Ex
viOpen
viOpenDefaultRM
viOut16
viOut16Ex
viOut32
viOut32Ex
viOut64
viOut64Ex
viOut8
viOut8Ex
viParseRsrc
viParseRsrcEx
viPeek16
viPeek32
viPeek64
viPeek8
viPoke16
viPoke32
viPoke64
viPoke8
viPrintf
viPxiReserveTriggers
viQueryf
viRead
viReadAsync
viReadSTB
viReadToFile
viSPrintf
viSScanf
viScanf
viSetAttribute
viSetBuf
viStatusDesc
viTerminate
viUninstallHandler
viUnlock
viUnmapAddress
viUnmapTrigger
viUsbControlIn
viUsbControlOut
viVPrintf
viVQueryf
viVSPrintf
viVSScanf
viVScanf
viVxiCommandQuery
viWaitOnEvent
viWrite
viWriteAsync
viWriteFromFile
NAMES

nm -D --defined-only "$library" | awk '{ print $3 }' | sort >"$work/exported"
diff -u "$work/expected" "$work/exported"

soname=$(readelf -d "$library" | sed -n 's/.*(SONAME).*\[\(.*\)\]/\1/p')
[ "$soname" = libkyvisa.so ] || { echo "SONAME is $soname"; exit 1; }
if readelf -d "$library" | grep -q 'NEEDED.*Qt'; then
    echo "the library needs Qt"
    exit 1
fi
