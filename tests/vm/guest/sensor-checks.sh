# The checks of the whole sensor over the kernel's own FC stack: `tavik` must show what was done to ports and LUNs. Sourced by
# checks.sh, whose functions it uses.

gState=/tmp/sensor
export TAVIK_CONFIG=$gState/tavik.toml

# start_sensor: starts the sensor instead of the agent. Fails if it does not collect after a long time.
start_sensor() {
  rm -rf $gState
  mkdir -p $gState/run $gState/state
  cat >$TAVIK_CONFIG <<END
[agent]
program = "/vm/bin/qrv-tvk"
library = "$ZT_LIBKPM_PATH"
log = "$gLog"
[sensor]
directory = "$gState/run"
state = "$gState/state"
[collect]
period = 0.2
[http]
listen = ""
[names]
"$(colons $gTargetName)" = "array1"
END
  tavik-sensor >/out/$gCheck-sensor.log 2>&1 &
  gSensor=$!
  wait_until 90 is_collecting
}
is_collecting() { [ "$(tavik --json status | jq .exit)" = 0 ]; }

stop_sensor() {
  kill $gSensor
  wait $gSensor
  expect_text "the sensor's end" 0 $?
}

# expect_shown WHAT EXPECTED FILTER ARGUMENT...: until the filter over the JSON of that command of tavik gives what is expected.
shows() {
  local lExpected=$1 lFilter=$2
  shift 2
  gGot=$(tavik --json "$@" | jq -r "$lFilter")
  [ "$gGot" = "$lExpected" ]
}
expect_shown() {
  local lWhat=$1 lExpected=$2
  shift
  wait_until 90 shows "$@"
  expect_text "$lWhat" "$lExpected" "$gGot"
}

# disk_of LUN: the name of its block device. array_of LUN: vendor and model, as the device itself names them.
disk_of() { basename "$(lun_device $1 block)"; }
array_of() {
  local lDevice
  lDevice=$(echo /sys/class/fc_host/host$gInitiator/device/rport-*/target*/*:*:*:$1)
  echo $(cat "$lDevice/vendor") $(cat "$lDevice/model")
}

# rescan LUN: the initiator asks the target for that LUN. forget LUN: its device is taken out, as after an unmapping on purpose.
rescan() {
  local lTarget
  lTarget=$(basename "$(echo /sys/class/fc_host/host$gInitiator/device/rport-*/target*)")
  lTarget=${lTarget#target*:}
  echo "$(echo $lTarget | tr : ' ') $1" >/sys/class/scsi_host/host$gInitiator/scan
}
forget() { echo 1 >"$(echo /sys/class/fc_host/host$gInitiator/device/rport-*/target*/*:*:*:$1)/delete"; }

# What `tavik paths` shows: a LUN a word, with its disk and how many of its paths run; the troubles.
gLuns='[.luns[] | "\(.paths[0].lun)=\(.paths[0].disk):\(.running)/\(.expected)\(if .gone then ":gone" else "" end)"] | sort | join(" ")'
gTroubles='[.troubles[] | select(.id | IN("flapping", "link-down") | not) | "\(.id):\(.severity)"] | join(" ")'
gLinksDown='[.troubles[] | select(.id == "link-down").subject | split(" ")[0]] | sort | join(" ")'
# luns_of LUN...: what that comes to where each of these LUNs runs on its one path.
luns_of() {
  local lLun lText=
  for lLun in "$@"; do lText="$lText $lLun=$(disk_of $lLun):1/1"; done
  echo $lText
}
all_luns() { luns_of 0 1 2 300; }
# What `tavik diff` shows at the initiator: as different, each change of state with how often; and what came and went in between.
gOurs='select(.initiator == null or .initiator.wwpn == "'$(colons $gInitiatorName)'")'
gChanges="[.changes[] | $gOurs"' | "\(.what) \(.before) -> \(.after)"] | group_by(.) | map("\(.[0]) x\(length)") | join("; ")'
# A link that is up again is Offline until its port has logged in. A slow machine shows that, a fast one does not.
gPassing="[.passing[] | $gOurs"' | "\(.what) \([.states[].state | select(. != "Offline")] | join(", "))"] | join("; ")'
# Where, how often and on what the events of a kind happened, of LUN 2.
gPlaces='[.episodes[] | select(.devices != null and .devices[0].lun == 2) | "\(.count) \(.remotePort.name) \(.devices[0] | "\(.vendor) \(.model) \(.disk)")"] | join("; ")'

check_names() { # links, LUNs and targets that go and come, and outcomes of commands, are shown by tavik with array and disk
  local lPlace lSeq lDevLoss
  stop_agent
  lPlace="array1 $(array_of 2) $(disk_of 2)"
  start_sensor || expect_text "the sensor" collecting "$(tavik status)"
  expect_shown "LUNs and their disks" "$(all_luns)" "$gLuns" paths

  answered 2 0c 28
  answered 2 0 02 03 11 00
  expect_shown "QUEUE FULL: port, array, disk" "12 $lPlace" "$gPlaces" events --kind queue-full
  expect_shown "a check condition: port, array, disk" "1 $lPlace" "$gPlaces" events --kind check-condition
  lSeq=$(tavik --json events --kind queue-full | jq '.episodes[0].episode')
  expect_text "the same for people" "$(disk_of 2), $(array_of 2)" \
    "$(COLUMNS=100 tavik explain $lSeq | sed -n 's/^ *LUN 2: \(.*\)\.$/\1/p')"

  lDevLoss=$(cat "$(target_port)/dev_loss_tmo")
  echo 300 >"$(target_port)/dev_loss_tmo" # a slow machine takes its time, and the devices are to stay
  tavik mark before
  expect_shown "nothing is different" "" "$gChanges" diff before
  set_link veth0 down
  expect_shown "a link that is down, in diff" \
    "link Online -> Linkdown x1; path running -> blocked x4; remotePort Online -> Blocked x1" "$gChanges" diff before
  expect_shown "and in paths" "lun-without-path:critical" "$gTroubles" paths
  expect_shown "with both of its ends" "array1 host$gInitiator" "$gLinksDown" paths
  set_link veth0 up
  expect_shown "the link is back" "" "$gChanges" diff before
  expect_shown "in between" "link Linkdown, Online; remotePort Blocked, Online" "$gPassing" diff before
  expect_shown "all paths run" "$(all_luns)" "$gLuns" paths

  lun_unmap 1
  forget 1
  post_event $gInitiator 5 1 03020100
  expect_shown "a LUN that is unmapped, in diff" "lun 1 path -> null x1" "$gChanges" diff before
  expect_shown "and in paths" "$(luns_of 0 2 300)" "$gLuns" paths
  lun_map 1 rd_mcp_1/memory
  rescan 1
  wait_until 60 lun_is_there 1
  post_event $gInitiator 5 1 03020100
  expect_shown "it is mapped again" "" "$gChanges" diff before

  tavik mark mapped
  echo 2 >"$(target_port)/dev_loss_tmo"
  echo 0 >$(controller veth1)/enabled
  issue_lip
  expect_shown "a target that is gone, in diff" "lun 1 path -> null x4; remotePort Online -> Not Present x1" "$gChanges" diff mapped
  expect_shown "and in paths" "lun-without-path:critical path-lost:warning" "$gTroubles" paths
  echo 1 >$(controller veth1)/enabled
  fabric_is_ready
  echo $lDevLoss >"$(target_port)/dev_loss_tmo"
  post_event $gInitiator 5 1 03020100
  expect_shown "the target is back" "" "$gChanges" diff mapped
  expect_shown "all paths run" "$(all_luns)" "$gLuns" paths
  stop_sensor
  start_agent
}
