#!/bin/sh
# Runs in a fresh Debian tree in which no systemd runs: the packages are installed, configured, run over the simulated library,
# upgraded from an earlier version with a history of the first schema, removed and purged. /packages holds before/ and now/.
set -u
. /tests/checks.sh
export DEBIAN_FRONTEND=noninteractive LC_ALL=C.UTF-8

export KPM_SIM_SCENARIO=/tests/scenario.kpm KPM_SIM_SOCKET=/run/tavik/sim.sock
lLibrary=$(echo /usr/lib/*-linux-gnu)/tavik/libkpm-sim.so

# start_sensor: as its user, with the one capability that it passes on, as the service does.
start_sensor() {
  systemd-tmpfiles --create tavik.conf
  setpriv --reuid=tavik --regid=tavik --init-groups --inh-caps=-all,+net_admin --ambient-caps=-all,+net_admin \
    --bounding-set=-all,+net_admin --no-new-privs tavik-sensor >>/out/sensor.log 2>&1 &
  gSensor=$!
  wait_until 90 is_collecting
  expect "tavik status, collecting" COLLECTING "$(tavik --json status | jq -r .verdict)"
}
# stop_sensor: in order.
stop_sensor() {
  kill $gSensor
  wait $gSensor
  expect "the sensor's exit status" 0 $?
  expect "pid files and the spool after the stop" "" "$(ls /run/tavik/agent/*.pid /var/lib/tavik/spool/* 2>/dev/null)"
}

list_files >/out/files-before
getent passwd >/out/users-before
getent group >/out/groups-before

step "Installing the version before"
expect_true "dpkg --install" dpkg --install /packages/before/tavik_*.deb /packages/before/tavik-sim_*.deb /packages/before/libkpm-dev_*.deb
expect "the user" "/var/lib/tavik /usr/sbin/nologin" "$(getent passwd tavik | cut -d: -f6,7 | tr : ' ')"
expect "what systemd-sysusers would still do" "" "$(systemd-sysusers --dry-run tavik.conf 2>&1)"
expect_true "systemd-tmpfiles --create" systemd-tmpfiles --create tavik.conf
expect "the folders" "/run/tavik tavik:tavik 755
/var/lib/tavik tavik:tavik 750
/var/log/tavik tavik:tavik 750" "$(stat -c '%n %U:%G %a' /run/tavik /var/lib/tavik /var/log/tavik)"
expect "the configuration as installed" "" "$(tavik-sensor --check 2>&1)"
expect "a line of the configuration that sets something" "" "$(grep -v '^#' /etc/tavik/tavik.toml | grep =)"
tavik status >/dev/null 2>&1
expect "tavik status without a sensor" 3 $?

step "Configuring"
sed -i "s|^#library = .*|library = \"$lLibrary\"|; s|^#days = .*|days = 3650|; s|^#log_level = .*|log_level = 63|" /etc/tavik/tavik.toml
expect "tavik-sensor --check" "" "$(tavik-sensor --check 2>&1)"
sqlite3 /var/lib/tavik/history.db </tests/history-1.sql
chown tavik:tavik /var/lib/tavik/history.db
chmod 640 /var/lib/tavik/history.db

step "Running the version before, on a history of the first schema"
start_sensor
kpm-sim wait --timeout 90 >/dev/null
expect_occurrences "QUEUE FULL: 1,000 of the history, 1,000 new ones" queue-full 2000
expect_occurrences "check conditions: 8 and 8" check-condition 16
lStore=$(store_id)

step "Rotating the agent's log"
lPids=$(pgrep -u tavik)
echo "what the agent rotated by itself" >/var/log/tavik/qrv-tvk.log.1
expect_true "logrotate" logrotate --force /etc/logrotate.d/tavik
expect_true "the agent writes a new log" wait_until 90 test -e /var/log/tavik/qrv-tvk.log
expect "the agent's own file" "what the agent rotated by itself" "$(cat /var/log/tavik/qrv-tvk.log.1)"
expect "rotated logs" "/var/log/tavik/qrv-tvk.log-$(date +%Y%m%d)" "$(ls /var/log/tavik/qrv-tvk.log-*)"
expect "the processes" "$lPids" "$(pgrep -u tavik)"
expect "messages about settings that were read again" "" "$(grep 'read again' /out/sensor.log)"
stop_sensor

step "Upgrading: what changes in the configuration is shown, and what we have changed is kept"
# The answers: show the differences, then keep ours.
printf 'D\nN\n' | PAGER=cat dpkg --install /packages/now/tavik_*.deb /packages/now/tavik-sim_*.deb /packages/now/libkpm-dev_*.deb >/out/upgrade 2>&1
expect "dpkg --install" 0 $?
expect_true "dpkg asks" grep -q "Configuration file '/etc/tavik/tavik.toml'" /out/upgrade
expect_true "it shows what the new version has no longer" grep -qx -- '-# As the version before had it.' /out/upgrade
expect_true "it shows what we have changed" grep -qx -- '-days = 3650' /out/upgrade
expect "our changes of the configuration" 3 "$(grep -c '^library = \|^days = \|^log_level = ' /etc/tavik/tavik.toml)"
expect "the new configuration, beside it" "#library = \"\"" "$(grep '^#library' /etc/tavik/tavik.toml.dpkg-dist)"
expect "the history" 2000 "$(occurrences queue-full)"
start_sensor
kpm-sim wait --timeout 90 >/dev/null
expect_occurrences "QUEUE FULL: 2,000 of the history, 1,000 new ones" queue-full 3000
expect "the history's id" "$lStore" "$(store_id)"
expect "what is lost, dropped and refused; gaps" "0 0 0 0" \
  "$(tavik --json status | jq -r '"\(.losses.inGaps) \(.losses.dropped) \([.losses.refused[]] | add) \(.gaps | length)"')"
expect_true "the database is whole" test "$(sqlite3 -readonly /var/lib/tavik/history.db 'pragma integrity_check')" = ok
stop_sensor

step "Removing"
expect_true "dpkg --remove" dpkg --remove tavik tavik-sim libkpm-dev
expect "programs that are left" "" "$(ls /usr/bin/tavik* /usr/bin/kpm-sim /usr/sbin/tavik* /usr/sbin/qrv-tvk /usr/libexec/tavik 2>/dev/null)"
expect_true "the history is kept" test -s /var/lib/tavik/history.db
expect_true "the configuration is kept" test -s /etc/tavik/tavik.toml

step "Purging"
expect_true "dpkg --purge" dpkg --purge tavik tavik-sim libkpm-dev
list_files >/out/files-after
expect "files that are left or gone" "" "$(diff /out/files-before /out/files-after | grep '^[<>]')"
expect "users that are left or gone" "" "$(getent passwd | diff /out/users-before - | grep '^[<>]')"
expect "groups that are left or gone" "" "$(getent group | diff /out/groups-before - | grep '^[<>]')"
echo "== end"
exit $gBad
