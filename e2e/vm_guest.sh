#!/bin/busybox sh
# The first and only process of the machine that vm_machine.py starts: does each step, keeps what came of it in /results, writes
# that and /devices as an archive to the drive "results" and switches the machine off. vm_test.py judges.
/bin/busybox --install -s /bin
export PATH=/bin
mount -t devtmpfs dev /dev && mount -t proc proc /proc && mount -t sysfs sys /sys
chmod 1777 /tmp
chown -R nobody /devices/nobody /devices/recorded
for controller in /sys/class/nvme/nvme*; do
  case $(cat "$controller/serial") in
    measured*) measured=${controller##*/} ;;
    results*) results=${controller##*/} ;;
  esac
done
[ -n "$measured" ] && [ -n "$results" ] || { echo "the drives are not there"; poweroff -f; }
echo "$measured" >/results/drive

step() {  # NAME COMMAND...
  name=/results/$1
  shift
  "$@" >"$name.out" 2>"$name.err"
  echo $? >"$name.status"
}
nobody() { su -s /bin/sh nobody -c "$*"; }
reading() {  # NAME; what others say of this moment
  nvme smart-log "/dev/$measured" -o json >"/results/$1.health"
  for block in /sys/block/*; do echo "${block##*/} $(cat "$block/stat")"; done >"/results/$1.disks"
  cat /proc/stat >"/results/$1.times"
}
between() {  # NAME COMMAND...
  reading "$1.before"
  step "$@"
  reading "$1.after"
}

between fresh tallyctl --json metrics sample
step writing dd if=/dev/zero of="/dev/${measured}n1" bs=1M count=50 oflag=direct conv=fsync
step reading dd if="/dev/${measured}n1" of=/dev/null bs=1M count=20 iflag=direct
between used tallyctl --json metrics sample

export TBDAILY_ROOT=/devices/nobody
step nobody.list nobody tallyctl --json metrics list
step nobody.day nobody tbdaily -f

export TBDAILY_ROOT=/devices/days
between first.day tbdaily -f
mv /devices/days/tomorrow.plist /devices/days/System/Device/clock.plist
step second.day tbdaily -f

step live.list tallyctl --json metrics list
between capture tallyctl capture --to /results/captured
cp -r /results/captured/System /devices/replayed
export TBDAILY_ROOT=/devices/replayed TBDAILY_LIVE=0
step replayed.list tallyctl --json metrics list
step replayed.sample tallyctl --json metrics sample
step replayed.day tbdaily -f
unset TBDAILY_LIVE

export TBDAILY_ROOT=/devices/recorded
step refused nobody tallyctl capture --only clock,nvme
between record tallyctl capture --only nvme
step recorded.sample nobody tallyctl --json metrics sample
step replace nobody tallyctl capture --only nvme --replace
step replaced.list nobody tallyctl --json metrics list

umount /sys
export TBDAILY_ROOT=/devices/nobody
step proc.list nobody tallyctl --json metrics list
step proc.day nobody tbdaily -f
mount -t sysfs sys /sys

samples() { wc -l </results/withdrawn.out; }
withdraw_drive() {  # while it is watched; two samples after that
  tallyctl --json metrics watch --interval 1 &
  until [ "$(samples)" -gt 0 ]; do usleep 100000; done
  echo 1 >"/sys/class/nvme/$measured/device/remove"
  [ ! -e "/dev/$measured" ] || echo "the drive is still there" >&2
  enough=$(($(samples) + 2))
  until [ "$(samples)" -ge "$enough" ]; do usleep 100000; done
  kill $!
  wait $!
}
step withdrawn withdraw_drive

tar -c -f "/dev/${results}n1" -C / results devices
sync
poweroff -f
