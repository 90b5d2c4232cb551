# The agent in the guest, and tavikctl as its sensor. Sourced by what runs in the guest, its shell included.

. /vm/fabric.sh

export ZT_QRV_SENSOR_DIR=/tmp/agent ZT_LIBKPM_PATH=/vm/lib/libkpm-linux.so
gLog=/tmp/agent/agent.log
gRecords=/tmp/records # the answers to every get since the agent was started, one JSON document each
gTracing=/sys/kernel/tracing

# start_agent [COMMAND...]: the agent, as an argument of the command where one is given (to take rights away); collecting.
start_agent() {
  rm -rf /tmp/agent
  mkdir -m 0700 /tmp/agent
  [ $# -eq 0 ] || chown "$("$@" id -u)" /tmp/agent
  : >$gRecords
  (cd /tmp/agent && exec "$@" qrv-tvk -D false -l $gLog) >/tmp/agent.out 2>&1 &
  gAgent=$!
  tavikctl targets "$(colons $gTargetNode),$(colons $gTargetName),0x000002" \
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
