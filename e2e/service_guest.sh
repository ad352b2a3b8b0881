#!/bin/sh
# What holds of the packages on a machine with a service manager. Runs inside of it, as root; the packages are in /packages, their own
# tests in /tests/debian. Its last line is "all of it holds".
set -eu
export DEBIAN_FRONTEND=noninteractive
root=/var/lib/tbdaily
logs=$root/var/mobile/Library/Logs
remembered=$root/var/mobile/Library/Preferences/com.velmora.tallyd.tbdaily.plist
step() { echo "== $*"; }
fail() {
  systemctl status --no-pager --lines=0 'tbdaily*' || true
  journalctl --no-pager -b | grep -v service_guest | tail -n 60
  echo "FAILED: $*"
  exit 1
}
reports() { ls "${1:-$logs}"/Pending/log-tallyd-*.193 2>/dev/null | wc -l; }
runs() { journalctl --no-pager -b -o cat -u tbdaily.service -u tbdaily-listener.service | grep -c 'daily tasks for day' || true; }
said() { journalctl --no-pager -b -o cat -u "$1" | grep -q "$2"; }
until_over() {
  for second in $(seq 60); do
    [ "$(systemctl show -P ActiveState "$1")" != inactive ] || return 0
    sleep 1
  done
  fail "$1 does not end"
}

step "installed"
dpkg -i /packages/tbdaily_*.deb /packages/libkdreport*.deb

step "the packages' own test of the service"
/tests/debian/service

step "the listener takes a status message and what applications there are"
rm "$remembered"
before=$(runs)
tallyctl wait com.velmora.tallyd.tbdaily.logging --timeout 30 &
waiting=$!
sleep 1
tallyctl send logging-status
wait "$waiting" || fail "the listener asks for nothing"
printf '[]' >/tmp/applications
tallyctl send app-info /tmp/applications
until_over tbdaily-listener.service
said tbdaily-listener.service 'got requestedAAI\|got <private>AAI' || fail "the listener got no answer"
[ "$(runs)" -eq $((before + 1)) ] || fail "the listener ran nothing"
systemctl is-active --quiet tbdaily-listener.socket || fail "the endpoint is gone"

step "timer and listener do the day once"
rm "$remembered"
before=$(runs)
tallyctl send logging-status
systemctl start tbdaily.service
until_over tbdaily-listener.service
[ "$(runs)" -eq $((before + 1)) ] || fail "the day ran $(($(runs) - before)) times"
[ "$(find $root ! -user tbdaily)" = "" ] || fail "files of another user: $(find $root ! -user tbdaily)"

step "a sandbox without network, and with the machine's figures"
tallyctl send logging-status
sleep 2
job=$(systemctl show -P MainPID tbdaily-listener.service)
grep -q '^CapEff:	0*$' "/proc/$job/status" || fail "the job has capabilities"
[ "$(stat -c %U "/proc/$job")" = tbdaily ] || fail "the job runs as $(stat -c %U "/proc/$job")"
until_over tbdaily-listener.service
tallyctl report --preview --day today | grep -q 'com.velmora.kdreport.memory.available' || fail "no figures of the machine were recorded"

step "an upgrade keeps everything, with the listener at work"
kept=$(reports)
[ "$kept" -gt 0 ] || fail "nothing waits"
echo '# kept' >>/etc/default/tbdaily
tallyctl send logging-status
dpkg -i /packages/tbdaily_*.deb
[ "$(reports)" -eq "$kept" ] || fail "an upgrade lost reports"
grep -q '^# kept$' /etc/default/tbdaily || fail "an upgrade lost the settings"
systemctl is-active --quiet tbdaily.timer tbdaily-listener.socket || fail "an upgrade stops the timer or the endpoint"
until_over tbdaily-listener.service
tallyctl send logging-status || fail "the endpoint is deaf after an upgrade"
until_over tbdaily-listener.service

step "a root elsewhere"
mkdir -p /srv
cp -a $root /srv/device
rm /srv/device/var/run/*.sock "/srv/device/${remembered#"$root"/}"
# As the page says.
sed -n '/^root=\/srv\/device$/,/^systemctl restart/p' /usr/share/doc/tbdaily/operations.md >/tmp/elsewhere
grep -q ReadWritePaths /tmp/elsewhere || fail "the page has no drop-in"
sh -eu /tmp/elsewhere
before=$(reports /srv/device/var/mobile/Library/Logs)
systemctl start tbdaily.service
[ "$(reports /srv/device/var/mobile/Library/Logs)" -gt "$before" ] || fail "no report at the other root"
tallyctl send logging-status || fail "no endpoint at the other root"
until_over tbdaily-listener.service
rm -r /etc/systemd/system/tbdaily*.d
systemctl daemon-reload

step "a message without a whitelist leaves the endpoint up"
echo TBDAILY_ROOT=$root >/etc/default/tbdaily
systemctl restart tbdaily-listener.socket
mv "$root/Library" /tmp/
for message in 1 2 3 4 5 6 7 8; do tallyctl send logging-status || true; done
sleep 3
systemctl is-active --quiet tbdaily-listener.socket || fail "the endpoint is gone"
mv /tmp/Library "$root/"
tallyctl send logging-status
until_over tbdaily-listener.service
said tbdaily-listener.service 'notified of logging status' || fail "the endpoint does not come back"

step "removed: the units stop, the device stays"
dpkg --remove tbdaily
[ "$(reports)" -ge "$kept" ] || fail "a removal lost reports"
[ "$(systemctl list-units --no-legend --state=active 'tbdaily*')" = "" ] || fail "units run on"

step "purged: nothing stays but the user"
dpkg --purge tbdaily
for path in $root /etc/default/tbdaily /var/lib/systemd/timers/stamp-tbdaily.timer /var/lib/systemd/deb-systemd-helper-enabled/tbdaily.timer.dsh-also \
    /etc/systemd/system/timers.target.wants/tbdaily.timer; do
  [ ! -e "$path" ] || fail "$path is still there"
done
[ -e /srv/device/var ] || fail "a purge took a root elsewhere"

step "the packages' own test of the library"
/tests/debian/library
echo "all of it holds"
