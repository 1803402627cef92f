#!/usr/bin/env bash
# Runs log-trouble where its trouble can happen: on a small file system of its own, or in a folder of nobody.
#   log-trouble.sh PROGRAM full|removed|forbidden
#   log-trouble.sh PROGRAM endurance SECONDS [RECORD_FILE]
set -euo pipefail
program=$1
trouble=$2
folder=$(mktemp -d)
trap 'chmod -R u+rwx "$folder"; rm -rf "$folder"' EXIT
mkdir "$folder/home" "$folder/log"
export HOME=$folder/home
unset XDG_DATA_HOME XDG_CONFIG_HOME XDG_DOCUMENTS_DIR
case $trouble in
  full)
    # A name space of mounts that ends with the program. Without the privilege a name space of users gives it; in a changed root the
    # mounts stay as they propagate.
    for options in -m "-m --propagation unchanged" -rm "-rm --propagation unchanged"; do
      unshare $options true 2>/dev/null && break
    done
    unshare $options sh -c 'mount -t tmpfs -o size=4m none "$1" || exit 1; "$2" full "$1"; status=$?; umount "$1"; exit $status' \
      sh "$folder/log" "$program" ;;
  forbidden)
    # Root may do everything: the program becomes nobody, to whom all of this belongs then.
    if [ "$(id -u)" = 0 ]; then
      chmod 755 "$folder"
      chown -R 65534:65534 "$folder"
    fi
    "$program" forbidden "$folder/log" ;;
  endurance) "$program" "$folder/log" "${@:3}" ;;
  *) "$program" "$trouble" "$folder/log" ;;
esac
