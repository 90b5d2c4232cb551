#!/bin/sh
# What scripts/test-vm --service tests: the installed service over real FC ports of this kernel. A real systemd starts it in its sandbox.
# The root step for tracefs is done and undone.
export PATH=/usr/sbin:/usr/bin:/sbin:/bin:/vm/bin:/vm/busybox LC_ALL=C.UTF-8 DEBIAN_FRONTEND=noninteractive
exec >/dev/ttyS1 2>&1
stty -F /dev/ttyS1 raw -echo
/vm/bin/busybox --install -s /vm/busybox
. /vm/fabric.sh
. /vm/packages/checks.sh
. /vm/packages/service-checks.sh
. /vm/packages/sandbox.sh
gTracing=/sys/kernel/tracing

finish() {
  journalctl -b --no-pager >/out/journal
  cp /var/log/tavik/* /out/ 2>/dev/null
  dmesg >/out/dmesg
  stty -F /dev/ttyS2 raw -echo
  tar -C /out -cf /dev/ttyS2 .
  printf 'end\037%s\n' "$1" >/dev/ttyS1
  for lPort in ttyS1 ttyS2; do stty -F /dev/$lPort >/dev/null; done # waits until all has gone out
  exit "$1"
}

step "systemd $(systemctl --version | sed -n '1s/systemd \([0-9]*\).*/\1/p') on Linux $(uname -r): two FC ports see each other"
fabric_up || finish 1
lModeBefore=$(stat -c '%a %U' $gTracing)

step "Installing"
expect_true "dpkg --install" dpkg --install /vm/packages/tavik_*.deb
expect_true "collects" wait_until 60 is_collecting
expect "the unit" "ActiveState=active Type=notify NRestarts=0" "$(properties ActiveState Type NRestarts)"
expect "the step for tracefs" "711 root / tavik" "$(stat -c '%a %U' $gTracing) / $(stat -c %U $gTracing/instances)"
expect "trace instances of the agent" 1 "$(ls $gTracing/instances | grep -c .)"
expect "kinds without rights" "" "$(tavik --json status | jq -r '.kinds[]? | .. | objects | select(.state? == "no_rights") | .kind')"
expect_rights

step "Every line of the sandbox does something"
expect_sandbox /vm/packages/sandbox.sh

step "Events of the fabric, the ports and the LUNs"
answered 2 0c 28 >/dev/null 2>&1
answered 2 3 08 >/dev/null 2>&1
answered 2 0 02 06 29 00 >/dev/null 2>&1
expect_occurrences "TASK SET FULL" queue-full 12
expect_occurrences "BUSY" device-busy 3
expect_true "check conditions" test "$(occurrences check-condition)" -ge 1
set_link veth0 down
wait_until 60 host_is "$gInitiator" Linkdown
set_link veth0 up
fabric_wait
expect_occurrences "link changes of both ends" link 4
post_event "$gInitiator" 5 1 03020100
expect_occurrences "an RSCN" rscn 1
tavik events
tavik ports

step "Stopping"
expect_true "stop" systemctl stop tavik
expect "the result" "ActiveState=inactive Result=success" "$(properties ActiveState Result)"
expect "tracefs is as before" "$lModeBefore / root" "$(stat -c '%a %U' $gTracing) / $(stat -c %U $gTracing/instances)"
expect "trace instances" 0 "$(ls $gTracing/instances | grep -c .)"
expect "probes" "" "$(cat $gTracing/kprobe_events)"

step "Starting again"
expect_true "start" systemctl start tavik
expect_true "collects" wait_until 60 is_collecting
answered 2 0c 28 >/dev/null 2>&1
expect_occurrences "the history goes on" queue-full 24
expect_true "purge" dpkg --purge tavik
expect "tracefs is as before" "$lModeBefore / root" "$(stat -c '%a %U' $gTracing) / $(stat -c %U $gTracing/instances)"
finish $gBad
