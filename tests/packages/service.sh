#!/bin/sh
# Runs in a tree that systemd has booted. The service is installed and started without an adapter. The version before runs over the
# simulated library and is upgraded. The new version is reloaded, made to hang, killed and removed, always within its sandbox.
# /packages holds before/ and now/.
set -u
. /tests/checks.sh
. /tests/service-checks.sh
. /tests/sandbox.sh
export DEBIAN_FRONTEND=noninteractive LC_ALL=C.UTF-8 SYSTEMD_PAGER=cat
trap 'journalctl -b >/out/journal; cp /var/log/tavik/* /out/ 2>/dev/null' EXIT
export KPM_SIM_SOCKET=/run/tavik/sim.sock
lLibrary=$(echo /usr/lib/*-linux-gnu)/tavik/libkpm-sim.so

step "Installing, on a host without adapters"
expect_true "dpkg --install" dpkg --install /packages/now/tavik_*.deb
expect "enabled" enabled "$(systemctl is-enabled tavik)"
expect "started by the installation" active "$(systemctl is-active tavik)"
expect_true "says that there are no adapters" wait_until 90 has_state no-adapters
expect "tavik status" "NOT COLLECTING; no Fibre Channel adapter was found" "$(tavik --json status | jq -r .text)"
expect "tavik check" 0 "$(tavik check >/dev/null; echo $?)"
expect "restarts, result" "NRestarts=0 Result=success" "$(properties NRestarts Result)"
expect "failed units" "" "$(systemctl list-units --failed --plain --no-legend tavik.service)"
expect "systemd-analyze verify" "" "$(systemd-analyze verify --man=no tavik.service 2>&1)"
expect "what systemd does not know or ignores" "" "$(journalctl -b _PID=1 | grep 'tavik.service:[0-9]')"
expect_true "purge" dpkg --purge tavik

step "The version before, over the simulated library"
expect_true "dpkg --install" dpkg --install /packages/before/tavik_*.deb /packages/before/tavik-sim_*.deb
drop_in simulation "Environment=KPM_SIM_SCENARIO=/opt/scenario.kpm KPM_SIM_SOCKET=$KPM_SIM_SOCKET"
install -m 644 /tests/scenario.kpm /opt/
configure "s|^#library = .*|library = \"$lLibrary\"|; s|^#log_level = .*|log_level = 63|"
expect_true "restart" systemctl restart tavik
expect_true "collects" wait_until 90 is_collecting
kpm-sim wait --timeout 90 >/dev/null
expect_occurrences "QUEUE FULL" queue-full 1000
expect_occurrences "check conditions" check-condition 8
expect "the unit of the version before" "Description=$(packed_unit before Description)" "$(properties Description)"

step "Upgrading a service that runs"
lPids=$(pids)
lStore=$(store_id)
expect_true "dpkg --install" dpkg --force-confdef --force-confold --install /packages/now/tavik_*.deb /packages/now/tavik-sim_*.deb
expect_true "collects again" wait_until 90 is_collecting
expect "processes of before that still run" "" "$(echo "$lPids" | while read -r lPid; do pids | grep -x "$lPid"; done)"
expect "the unit of the new version" "Description=$(packed_unit now Description) NeedDaemonReload=no" "$(properties Description NeedDaemonReload)"
expect "the time of the watchdog, as the sensor got it" "$(packed_unit now WatchdogSec)" \
  "$(tr '\0' '\n' <"/proc/$(keeper_pid)/environ" | sed -n 's/^WATCHDOG_USEC=\(.*\)000000$/\1s/p')"
expect "files that are not those of the new version" "/etc/tavik/tavik.toml" "$(dpkg --verify tavik | cut -c 13-)"
kpm-sim wait --timeout 90 >/dev/null
expect_occurrences "the history goes on" queue-full 2000
expect_occurrences "check conditions" check-condition 16
expect "the history's id" "$lStore" "$(store_id)"
expect "the type of the start" "Type=notify NotifyAccess=main" "$(properties Type NotifyAccess)"
expect "the HTTP interface answers" "HTTP/1.1 200 OK" "$(http_status 127.0.0.1 9632 /healthz)"
expect_rights

step "Every line of the sandbox is in force"
sandbox_lines | while IFS='=' read -r lKey lValue; do
  expect "$lKey" "$lKey=$lValue" "$(properties "$lKey")"
done >/tmp/sandbox
grep -c '^ok' /tmp/sandbox | sed 's/$/ lines are/'
grep -v '^ok' /tmp/sandbox
expect_true "more than fifteen lines" test "$(grep -c '^ok' /tmp/sandbox)" -gt 15
expect "the seccomp filter, the address families" "" "$(properties SystemCallFilter RestrictAddressFamilies | grep -wo 'mount\|reboot\|AF_PACKET')"

step "Every line of the sandbox does something"
expect_sandbox /tests/sandbox.sh

step "All outlets work within it"
cp -p /etc/tavik/tavik.toml /opt/tavik.toml
sed -i '/^\[ndjson\]/,/^\[/s|^#path = .*|path = "/var/lib/tavik/events.ndjson"|
  /^\[journal\]/,/^\[/s|^#enabled = .*|enabled = true|' /etc/tavik/tavik.toml
printf '[[warn]]\nkind = "queue-full"\ncount = 1\nwithin = "5m"\nrun = ["/usr/bin/tee", "/var/lib/tavik/warned"]\n' >>/etc/tavik/tavik.toml
expect_true "restart" systemctl restart tavik
expect_true "collects" wait_until 90 is_collecting
kpm-sim wait --timeout 90 >/dev/null
expect_occurrences "QUEUE FULL, once more" queue-full 3000
expect_true "lines of JSON" wait_until 90 grep -q '"kind":"queue-full"' /var/lib/tavik/events.ndjson
expect_true "the journal" wait_until 90 has_journal_entry TAVIK_KIND=queue-full
expect_true "a warning's program, run by an event" wait_until 90 grep -q '"queue-full"' /var/lib/tavik/warned
expect_true "tavik warn --test" tavik warn --test
for lPath in / /app.js /metrics "/api/v1/events?limit=5" /api/v1/paths /api/v1/timeline /api/v1/diff; do
  expect "GET $lPath" "HTTP/1.1 200 OK" "$(http_status 127.0.0.1 9632 "$lPath")"
done
cp -p /opt/tavik.toml /etc/tavik/tavik.toml
expect_true "restart" systemctl restart tavik
expect_true "collects" wait_until 90 is_collecting
kpm-sim wait --timeout 90 >/dev/null
expect_occurrences "QUEUE FULL, once more" queue-full 4000

step "Reloading the configuration"
lPids=$(pids)
configure 's|^#period = .*|period = 1.5|'
expect_true "reload" systemctl reload tavik
expect_true "the sensor says so" wait_until 90 said_lately "was read again; 1 key has changed"
configure 's|^period = .*|period = "soon"|'
systemctl reload tavik
expect_true "a bad file is reported" wait_until 90 said_lately "collect.period: "
configure 's|^period = .*|#period = 5.0|'
expect "the same processes" "$lPids" "$(pids)"

step "The log is rotated"
lPids=$(pids)
expect_true "logrotate" logrotate --force /etc/logrotate.d/tavik
expect_true "the agent writes a new log" wait_until 90 test -e /var/log/tavik/qrv-tvk.log
expect "the same processes" "$lPids" "$(pids)"

step "Killed and hung"
lAgent=$(agent_pid)
kill -KILL "$lAgent"
expect_true "another agent" wait_until 90 is_other_agent "$lAgent"
expect_true "collects again" wait_until 90 is_collecting
kpm-sim wait --timeout 90 >/dev/null
expect_occurrences "the scenario, once more" queue-full 5000
expect_rights
expect "restarts by systemd" "NRestarts=0" "$(properties NRestarts)"
# The sensor feeds it with each look of the collector, every five seconds.
drop_in watchdog "WatchdogSec=20s"
expect_true "restart" systemctl restart tavik
expect_true "collects" wait_until 90 is_collecting
kpm-sim wait --timeout 90 >/dev/null
expect_occurrences "the scenario, once more" queue-full 6000
sleep 22 # longer than the watchdog: a sensor that is well feeds it in time
expect "restarts of a sensor that is well" "NRestarts=0" "$(properties NRestarts)"
kill -STOP "$(keeper_pid)"
expect_true "a sensor that hangs is replaced" wait_until 90 has_restarted
expect_true "collects again" wait_until 90 is_collecting
kpm-sim wait --timeout 90 >/dev/null
expect_occurrences "the scenario, once more" queue-full 7000
rm /etc/systemd/system/tavik.service.d/watchdog.conf

step "A textfile, and an address for everybody"
install -D -m 644 /drop-ins/textfile.conf /drop-ins/http-public.conf -t /etc/systemd/system/tavik.service.d
mkdir -p /var/lib/prometheus/node-exporter
configure 's|^#textfile = .*|textfile = "/var/lib/prometheus/node-exporter/tavik.prom"|
  s|^#listen = .*|listen = "0.0.0.0:9632"|; s|^#public = .*|public = true|; s|^#hosts = .*|hosts = ["db01.example.net"]|'
systemctl daemon-reload
expect "systemd-analyze verify" "" "$(systemd-analyze verify --man=no tavik.service 2>&1)"
expect_true "restart" systemctl restart tavik
expect_true "the textfile" wait_until 90 grep -q '^tavik_agent_up 1' /var/lib/prometheus/node-exporter/tavik.prom
expect "the file's owner" "tavik:tavik" "$(stat -c %U:%G /var/lib/prometheus/node-exporter/tavik.prom)"
ip address add 192.0.2.1/32 dev lo
expect_true "collects" wait_until 90 is_collecting
expect "an answer on another address" "HTTP/1.1 200 OK" "$(http_status 192.0.2.1 9632 /healthz)"
rm /etc/systemd/system/tavik.service.d/textfile.conf /etc/systemd/system/tavik.service.d/http-public.conf
rm -r /var/lib/prometheus
configure 's|^textfile = .*|#textfile = ""|; s|^listen = .*|#listen = "127.0.0.1:9632"|; s|^public = .*|#public = false|; s|^hosts = .*|#hosts = []|'
systemctl daemon-reload
systemctl restart tavik
expect_true "collects" wait_until 90 is_collecting

step "A configuration that cannot be used"
configure 's|^#gap = .*|gap = "never"|'
systemctl restart tavik 2>/dev/null
expect_true "failed, not tried again" wait_until 90 test "$(properties ActiveState NRestarts ExecMainStatus)" = "ActiveState=failed NRestarts=0 ExecMainStatus=2"
expect_true "the reason is in the journal" said_lately "episode.gap: "
configure 's|^gap = .*|#gap = 60|'
expect_true "start" systemctl start tavik

step "Stopping, removing, purging"
lStart=$(date +%s)
expect_true "stop" systemctl stop tavik
expect_true "within twenty seconds" test $(($(date +%s) - lStart)) -le 20
expect "the result" "ActiveState=inactive Result=success" "$(properties ActiveState Result)"
expect "the runtime directory" "" "$(ls -d /run/tavik 2>/dev/null)"
expect "processes" "" "$(pgrep -u tavik)"
systemctl start tavik
rm -r /etc/systemd/system/tavik.service.d /opt/scenario.kpm
expect_true "purge while it runs" dpkg --purge tavik tavik-sim
expect "processes" "" "$(pgrep -f '/tavik-sensor|/tavik-collector|/qrv-tvk')"
expect "the user" "" "$(getent passwd tavik)"
expect "files" "" "$(ls -d /etc/tavik /run/tavik /var/lib/tavik /var/log/tavik /etc/systemd/system/*/tavik.service 2>/dev/null)"

echo "== end"
exit $gBad
