# The agent in the guest, and tavikctl as its sensor. Sourced by the scripts that run in the guest, and by its shell.

. /vm/fabric.sh

export ZT_QRV_SENSOR_DIR=/tmp/agent ZT_LIBKPM_PATH=/vm/lib/libkpm-linux.so
gLog=/tmp/agent/agent.log
gRecords=/tmp/records # the answers to every get since the agent was started, one JSON document each
gTracing=/sys/kernel/tracing

# start_agent [COMMAND...]: starts the agent, and collecting. The command, if there is one, runs the agent; it can take rights away.
start_agent() {
  rm -rf /tmp/agent
  mkdir -m 0700 /tmp/agent
  [ $# -eq 0 ] || chown "$("$@" id -u)" /tmp/agent
  : >$gRecords
  (cd /tmp/agent && exec "$@" qrv-tvk -D false -l $gLog) >/tmp/agent.out 2>&1 &
  gAgent=$!
  tavikctl --wait targets "$(colons $gTargetNode),$(colons $gTargetName),0x000002" \
    "$(colons $gInitiatorNode),$(colons $gInitiatorName),0x000001" >/dev/null && tavikctl start >/dev/null
}

# stop_agent: by command; its exit status in gAgentStatus.
stop_agent() {
  tavikctl shutdown >/dev/null
  wait $gAgent
  gAgentStatus=$?
}

collect() { tavikctl --json get >>$gRecords; }

# query FILTER: of all records collected so far, as one array; each has its initiator's port name as .board.
query() { jq -rs "[.[].lists[] | .initiator.portName as \$board | .records[] | . + {board: \$board}] | $1" $gRecords; }

# total KIND [BOARD]: a filter that adds up the occurrences of a kind.
total() {
  local lBoard=${2:-$gInitiatorName}
  echo "[.[] | select(.kind == \"$1\" and .board == \"$(colons $lBoard)\").occurrences] | add // 0"
}

# logged TEXT: the lines of the agent's log with that text, without time and place.
logged() { sed -n 's/^[^ ]* [^ ]* -\(.\)- [^ ]* [^ ]*: /-\1- /p' $gLog | sed 's/Libkpm: //' | grep -F -- "$1"; }

# lost TEXT: the last running total of a loss.
lost() { logged "$1" | sed -n 's/.*(\([0-9]*\) since the start).*/\1/p' | tail -n 1 | grep . || echo 0; }

instances() { ls $gTracing/instances | grep -c . ; }

# outcomes_instance: the directory of the agent's instance of finished commands. Sense data by the probe have one of their own.
outcomes_instance() { ls -d $gTracing/instances/* | grep -v sense; }

# shrink_buffers: each trace buffer of the agent holds eight kilobytes from now on.
shrink_buffers() {
  local lInstance
  for lInstance in $gTracing/instances/*; do echo 8 >$lInstance/buffer_size_kb; done
}

# now: milliseconds since the boot.
now() { sed 's/\([0-9]*\)\.\([0-9][0-9]\).*/\1\20/' /proc/uptime; }

# recorded: the SCSI outcomes that the kernel's filter has let through to the agent so far, read or not.
recorded() {
  cat $gTracing/instances/*/per_cpu/cpu*/stats |
    awk -F ': ' '/^(entries|overrun|commit overrun|dropped events|read events):/ {n += $2} END {print n + 0}'
}

# agent_time: nanoseconds of processor time of all its threads. agent_wakes: how often they have waited.
agent_time() { cat /proc/$gAgent/task/*/schedstat | awk '{n += $1} END {printf "%.0f\n", n}'; }
agent_wakes() { cat /proc/$gAgent/task/*/status | awk '/^voluntary_ctxt_switches/ {n += $2} END {print n}'; }

# busy_time: nanoseconds that the machine's processors were not idle.
busy_time() { awk '$1 == "cpu" {printf "%.0f\n", ($2 + $3 + $4 + $7 + $8) * 10000000}' /proc/stat; }

# probe_hits: how often the kernel has run any probe so far.
probe_hits() { awk '{n += $(NF - 1)} END {print n + 0}' $gTracing/kprobe_profile; }

processors() { grep -c ^processor /proc/cpuinfo; }

# repeated TIMES DEVICE EACH BYTE...: so many senders at once, each of which sends the command so many times.
repeated() {
  local lPids= lLeft=$1
  shift
  while [ $lLeft -gt 0 ]; do
    scsi-repeat "$@" &
    lPids="$lPids $!"
    lLeft=$((lLeft - 1))
  done
  wait $lPids
}
gGood='00 00 00 00 00 00'               # TEST UNIT READY
gPastEnd='28 00 0f ff ff ff 00 00 01 00' # READ(10)

# other_disk: a SCSI device that is no FC host's.
other_disk() {
  local lPath
  for lPath in /sys/bus/pseudo/devices/adapter*/host*/target*/*:*:*:0/scsi_generic/*; do
    [ -e "$lPath" ] && echo "/dev/${lPath##*/}" && return
  done
  return 1
}
