#!/bin/sh
# What a power cut leaves of one run of a command: the file system lies in an image on a loop device, and
# what has reached the image at a moment is what a power cut at that moment would leave. To be run in a
# mount name space of its own, as root.
#   power_cut.sh BASE OPTIONS WORK SYNC COMMAND...
# BASE is an image of an unmounted file system; a copy of it is mounted at WORK/m with the OPTIONS, the
# command is run, and is expected to be killed. With SYNC "sync" another file of the file system is made
# lasting then. What is found on a copy of the image is put into WORK/found.
set -eu
base=$1 options=$2 work=$3 sync=$4
shift 4
mkdir -p "$work/m" "$work/c"
rm -rf "$work/found"
cp --sparse=always "$base" "$work/live"
mount -o "loop,$options" "$work/live" "$work/m"
code=0
"$@" || code=$?
if [ "$sync" = sync ]; then
  echo x >"$work/m/other"
  sync "$work/m/other"
fi
cp --sparse=always "$work/live" "$work/cut"
umount "$work/m"
mount -o loop "$work/cut" "$work/c"
cp -a "$work/c" "$work/found"
umount "$work/c"
# 100 and more say that all went well here.
exit $((100 + code % 100))
