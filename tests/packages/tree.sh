#!/bin/sh
# Runs in a fresh Debian tree without systemd. The packages are installed and purged. The version before is installed, configured,
# run over the simulated library with a history of the first schema, and upgraded. The new version is run, removed and purged.
# /packages has before/ and now/. Values that differ between the two are read from the packages.
set -u
. /tests/checks.sh
export DEBIAN_FRONTEND=noninteractive LC_ALL=C.UTF-8

export KPM_SIM_SCENARIO=/tests/scenario.kpm KPM_SIM_SOCKET=/run/tavik/sim.sock
lLibrary=$(echo /usr/lib/*-linux-gnu)/tavik/libkpm-sim.so

lVersionBefore=$(dpkg-deb --field /packages/before/tavik_*.deb Version)
lVersionNow=$(dpkg-deb --field /packages/now/tavik_*.deb Version)
# packed WHEN FILE: the file as the packages of /packages/WHEN have it. names_of WHEN: all files of the package tavik.
packed() { dpkg-deb --fsys-tarfile "/packages/$1"/tavik_*.deb | tar -xO "./$2"; }
names_of() { dpkg-deb --contents "/packages/$1"/tavik_*.deb | awk '{ print $6 }' | sed 's/^\.//' | grep -v '/$' | sort; }
versions() { dpkg-query -W -f '${Version}\n' tavik tavik-sim libkpm-dev | sort -u; }
schema() { sqlite3 -readonly /var/lib/tavik/history.db 'pragma user_version'; }

# make_folders: as the package says, or by hand where an early version does not.
make_folders() { systemd-tmpfiles --create tavik.conf 2>/dev/null || install -d -o tavik -g tavik /run/tavik /var/lib/tavik /var/log/tavik; }
# start_sensor: as its user, with the one capability that it passes on, as the service does.
start_sensor() {
  make_folders
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

step "Installing"
expect_true "dpkg --install" dpkg --install /packages/now/tavik_*.deb /packages/now/tavik-sim_*.deb /packages/now/libkpm-dev_*.deb
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
expect_true "dpkg --purge" dpkg --purge tavik tavik-sim libkpm-dev

step "Installing the version before, $lVersionBefore"
expect_true "it is lower than $lVersionNow" dpkg --compare-versions "$lVersionBefore" lt "$lVersionNow"
names_of before >/tmp/names-before
expect_true "dpkg --install" dpkg --install /packages/before/tavik_*.deb /packages/before/tavik-sim_*.deb /packages/before/libkpm-dev_*.deb

step "Configuring"
sed -i "s|^#library = .*|library = \"$lLibrary\"|; s|^#days = .*|days = 3650|; s|^#log_level = .*|log_level = 63|" /etc/tavik/tavik.toml
expect "tavik-sensor --check" "" "$(tavik-sensor --check 2>&1)"
make_folders
sqlite3 /var/lib/tavik/history.db </tests/history-1.sql
chown tavik:tavik /var/lib/tavik/history.db
chmod 640 /var/lib/tavik/history.db

step "Running the version before, on a history of the first schema"
start_sensor
kpm-sim wait --timeout 90 >/dev/null
expect_occurrences "QUEUE FULL: 1,000 of the history, 1,000 new ones" queue-full 2000
expect_occurrences "check conditions: 8 and 8" check-condition 16
lStore=$(store_id)
stop_sensor

step "Upgrading to $lVersionNow: what changes in the configuration is shown, and what we have changed is kept"
lSchema=$(schema)
# The answers: show the differences, then keep ours.
printf 'D\nN\n' | PAGER=cat dpkg --install /packages/now/tavik_*.deb /packages/now/tavik-sim_*.deb /packages/now/libkpm-dev_*.deb >/out/upgrade 2>&1
expect "dpkg --install" 0 $?
expect "the versions" "$lVersionNow" "$(versions)"
expect "what dpkg asks about" "Configuration file '/etc/tavik/tavik.toml'" "$(grep '^Configuration file' /out/upgrade | sort -u)"
packed before etc/tavik/tavik.toml >/tmp/toml-before
packed now etc/tavik/tavik.toml >/tmp/toml-now
grep -vxFf /tmp/toml-now /tmp/toml-before | sort -u >/tmp/toml-gone
expect_true "something in it has changed" test -s /tmp/toml-gone
expect "what the new version has no longer, and is not shown" "" \
  "$(while read -r lLine; do grep -qxF -- "-$lLine" /out/upgrade || echo "$lLine"; done </tmp/toml-gone)"
expect_true "it shows what we have changed" grep -qx -- '-days = 3650' /out/upgrade
expect "our changes of the configuration" 3 "$(grep -c '^library = \|^days = \|^log_level = ' /etc/tavik/tavik.toml)"
expect_true "the new configuration, beside it" cmp /tmp/toml-now /etc/tavik/tavik.toml.dpkg-dist
expect "files that are not those of the new version" "/etc/tavik/tavik.toml" "$(dpkg --verify tavik | cut -c 13-)"
names_of now >/tmp/names-now
expect "files that went with the version before, and are still there" "" \
  "$(comm -23 /tmp/names-before /tmp/names-now | while read -r lFile; do ls -d "$lFile" 2>/dev/null; done)"
start_sensor
kpm-sim wait --timeout 90 >/dev/null
expect_occurrences "QUEUE FULL: 2,000 of the history, 1,000 new ones" queue-full 3000
expect "the history's id" "$lStore" "$(store_id)"
expect_true "the schema was $lSchema, is $(schema)" test "$lSchema" -gt 0 -a "$(schema)" -ge "$lSchema"
expect "what is lost, dropped and refused; gaps" "0 0 0 0" \
  "$(tavik --json status | jq -r '"\(.losses.inGaps) \(.losses.dropped) \([.losses.refused[]] | add) \(.gaps | length)"')"
expect_true "the database is whole" test "$(sqlite3 -readonly /var/lib/tavik/history.db 'pragma integrity_check')" = ok

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
