# The checks. Each is a function check_NAME, with a comment that says what it shows. It gets an agent that collects. For each
# expectation it writes one line to the second serial port: ok or FAIL, the check, what was checked, what was expected and what came,
# separated by the character 037.
. /vm/agent.sh
. /vm/sensor-checks.sh
. /vm/change-checks.sh
. /vm/rights-checks.sh
exec 3>/dev/ttyS1
gBad=0

report() { printf '%s\037%s\037%s\037%s\037%s\n' "$@" >&3; }

# expect_text WHAT EXPECTED GOT
expect_text() {
  if [ "$2" = "$3" ]; then
    report ok "$gCheck" "$@"
  else
    report FAIL "$gCheck" "$@"
    gBad=1
  fi
}

# expect WHAT EXPECTED FILTER: collects until the filter over all records gives the expected text, for twenty seconds at most.
gives() {
  collect
  gGot=$(query "$2")
  [ "$gGot" = "$1" ]
}
expect() {
  wait_until 20 gives "$2" "$3"
  expect_text "$1" "$2" "$gGot"
}
# expect_still: the same, after the library has looked at everything once more. Shows that no further event came.
expect_still() {
  usleep 2500000
  expect "$@"
}

# expect_logged WHAT EXPECTED TEXT: the log's lines with the text.
is_logged() { [ "$(logged "$2")" = "$1" ]; }
expect_logged() {
  wait_until 20 is_logged "$2" "$3"
  expect_text "$1" "$2" "$(logged "$3")"
}

# The state in which every check begins: the two ports see each other, and the LUNs are there.
fabric_is_ready() { fabric_wait || expect_text "the ports and LUNs" "all there" "not within a minute"; }

# expect_reason WHAT TEXT: the log has TEXT as a warning. After a semicolon it may say what would help.
expect_reason() {
  expect_text "$1" "-W- $2" "$(logged "${2%%:*}" | sed "s#$gTracing/instances/[^ ]*#PATH#; s/;.*//")"
}

check_adapters() { # every FC host is a board, in the order of host numbers, with its names
  expect_text "names at discovery" \
    "<$(colons $gInitiatorNode), $(colons $gInitiatorName)> <$(colons $gTargetNode), $(colons $gTargetName)>" \
    "$(echo $(logged 'Discovered QRV initiator' | sed 's/.*initiator //'))"
  collect
  expect_text "boards in an answer" "$(colons $gInitiatorName) $(colons $gTargetName)" \
    "$(echo $(jq -r '.lists[].initiator.portName' $gRecords))"
  expect_text "what the kernel cannot tell is said" \
    "plogi prlo adisc lsrjt logo fabric-busy port-busy fcp-read-check lun-reset target-reset bus-reset port-interrupt temperature" \
    "$(echo $(logged 'cannot deliver' | sed 's/.*deliver: //; s/,//g'))"
}

check_link() { # a link that goes down and up is two link events of each end
  set_link veth0 down
  expect "down, initiator's end" 1 "$(total link)"
  expect "down, target's end" 1 "$(total link $gTargetName)"
  set_link veth0 up
  expect "up, initiator's end" 2 "$(total link)"
  expect_still "up, target's end" 2 "$(total link $gTargetName)"
  expect "remote ports of link records" "" '[.[] | select(.kind == "link").remotePort | values | .portName] | join(" ")'
  fabric_is_ready
}

check_flaps() { # a link that flaps faster than it can be looked at comes to rest with an even count, up
  local lTimes=0 lMost=$((6 * gFactor))
  while [ $lTimes -lt $lMost ]; do
    set_link veth0 down
    set_link veth0 up
    lTimes=$((lTimes + 1))
  done
  fabric_is_ready
  expect_still "link events, even" "0 0" "[($(total link)) % 2, ($(total link $gTargetName)) % 2 | tostring] | join(\" \")"
  expect "some, and no more than there were" true "($(total link)) > 0 and ($(total link)) <= $((2 * lMost))"
}

check_lip() { # a reset of the link's loop is no link event, and the ports see each other again
  issue_lip
  expect_still "link events, even" 0 "($(total link)) % 2" # by then the kernel has begun, on a slow machine too
  fabric_is_ready
  expect_text "the target" Online "$(cat "$(target_port)/port_state")"
}

# The check conditions of one (key, asc), as one word.
outcome() {
  echo "[.[] | select(.kind == \"check-condition\" and $1) | \"\\(.remotePort.portName) n=\\(.occurrences) key=\\(.data.senseKey) \
asc=\\(.data.asc) luns=\\(.data.luns) opcodes=\\(.data.commandCodes) ascqs=\\(.data.ascqs)\"] | join(\"; \")" | tr -s ' '
}

# Whether there is a failed READ(10) of that LUN: other commands fail while devices are looked for.
reads_fail() { echo "any(.[]; .kind == \"check-condition\" and (.data.luns | index($1)) and (.data.commandCodes | index(40)))"; }

check_sense() { # check conditions with LUN, operation code and sense data, from the trace or by the probe
  senses
}
senses() {
  local lPort
  lPort=$(colons $gTargetName)
  past_end 0
  expect "a read past the end" "$lPort n=1 $(sense 5 33) luns=[0] opcodes=[40] ascqs=[0]" "$(outcome true)"
  : >$gRecords
  unknown_command 1
  expect "an unknown command" "$lPort n=1 $(sense 5 32) luns=[1] opcodes=[238] ascqs=[0]" "$(outcome true)"
  : >$gRecords
  answered 2 0 02 06 29 03
  answered 2 0 02 06 29 07
  expect "two unit attentions" "$lPort n=2 $(sense 6 41) luns=[2] opcodes=[40] ascqs=[3,7]" "$(outcome true)"
}
sense() { echo "key=$1 asc=$2"; }
no_sense() { echo "key=4294967295 asc=4294967295"; }
has_sense() { grep -q sense_key $gTracing/events/scsi/scsi_dispatch_cmd_done/format; }
# How many records the kernel makes of one check condition, each in an instance of its own.
records_of_one() { ls $gTracing/events | grep -q '^libkpm_linux' && echo 2 || echo 1; }

check_probe() { # sense data by the probe are the same as those of the trace; the probe is gone with the agent, and no other
  stop_agent
  echo 'p:someone/probe scsi_check_sense' >>$gTracing/kprobe_events
  echo 1 >$gTracing/events/someone/probe/enable
  export KPM_LINUX_PROBE=1
  start_agent
  expect_text "probes while it runs" "2" "$(grep -c scsi_check_sense $gTracing/kprobe_events)"
  senses
  local lHits
  lHits=$(probe_hits)
  repeated 1 $(sg_of 0) 500 $gGood
  expect_text "hits of the probes by 500 good commands" 0 $(($(probe_hits) - lHits))
  repeated 1 $(sg_of 0) 5 $gPastEnd
  expect_text "and by 5 failed ones, each probe" 10 $(($(probe_hits) - lHits))
  kill -9 $gAgent
  wait $gAgent 2>/dev/null
  start_agent
  expect_text "probes, after a killed one and its next" "2" "$(grep -c scsi_check_sense $gTracing/kprobe_events)"
  stop_agent
  unset KPM_LINUX_PROBE
  expect_text "probes after it" "p:someone/probe" "$(cut -d' ' -f1 $gTracing/kprobe_events)"
  echo 0 >$gTracing/events/someone/probe/enable
  echo '-:someone/probe' >>$gTracing/kprobe_events
  start_agent
}

check_probe_off() { # with kprobes switched off, check conditions come without sense data, and each once
  stop_agent
  export KPM_LINUX_PROBE=1
  start_agent
  echo 0 >/sys/kernel/debug/kprobes/enabled
  past_end 0
  expect_still "a read past the end" "$(colons $gTargetName) n=1 $(no_sense) luns=[0] opcodes=[40] ascqs=[]" "$(outcome true)"
  echo 1 >/sys/kernel/debug/kprobes/enabled
  unset KPM_LINUX_PROBE
}

check_queue_depth() { # a queue depth that changes is delivered
  local lDevice=/sys/class/scsi_device/$gInitiator:0:0:1/device
  local lDepth
  lDepth=$(cat $lDevice/queue_depth)
  usleep 2500000
  echo $((lDepth - 1)) >$lDevice/queue_depth
  expect "one change" 1 "$(total queue-depth)"
  echo $lDepth >$lDevice/queue_depth
  expect_still "and back" 2 "$(total queue-depth)"
}

check_busy() { # busy and task set full are counted, each time they are answered
  answered 2 3 08
  expect "busy" 3 "$(total device-busy)"
  answered 2 4 28
  expect "task set full" 4 "$(total queue-full)"
  expect_still "LUNs" "[2]" '[.[].data.luns | tostring] | unique | join(" ")'
}

check_high_lun() { # a LUN beyond the bits of a record
  past_end 300
  expect "an event of LUN 300" "n=1 luns=[]" '[.[] | "n=\(.occurrences) luns=\(.data.luns)"] | join("; ")'
}

check_rscn() { # what a driver posts of the fabric comes as RSCN pages
  post_event $gInitiator 5 1 03020100
  expect "a port's page" "66051 port" '[.[] | select(.kind == "rscn") | "\(.data.page) \(.data.addressFormatName)"] | join("; ")'
  : >$gRecords
  post_event $gTarget 5 2 00000003
  expect "the fabric's page, twice, of the other board" "2 50331648 fabric $(colons $gTargetName)" \
    '[.[] | select(.kind == "rscn") | "\(.occurrences) \(.data.page) \(.data.addressFormatName) \(.board)"] | join("; ")'
}

check_messages() { # link messages between two looks are counted; what no driver sent is dropped, and said
  post_event $gInitiator 3 1 00000000
  post_event $gInitiator 2 1 00000000
  expect_still "down and up while the link is seen up" 2 "$(total link)"
  post_event $gInitiator 501 1 16000000000000240002000100000000200002000000000210000200000000010003000000000001
  post_event $gInitiator ffff 1 0102030405060708
  fc-capture forge 3
  expect_logged "a forged message" "-W- 1 FC messages are dropped: the kernel did not send them (1 since the start)" dropped
  expect_still "no event of all these" 2 "$(total link) + ([.[] | select(.kind != \"link\")] | length)"
}

# sums_up KIND LOSS EXPECTED: the events of that kind that came, and the losses in the log, add up to EXPECTED.
sums_up() {
  collect
  gGot=$(query "$(total $1)")
  gLost=$(lost "$2")
  [ $((gGot + gLost)) -ge $3 ]
}
# expect_sum KIND LOSS EXPECTED
expect_sum() {
  wait_until 20 sums_up "$@"
  expect_text "$1: what came and what is said to be lost, together ($gGot, $gLost)" $3 $((gGot + gLost))
}

check_message_storm() { # a storm of messages that the agent reads comes whole; of one that it cannot read, each loss is counted
  post_event $gInitiator 5 2000 03020100
  expect_sum rscn 'were passed over' 2000
  kill -STOP $gAgent
  post_event $gInitiator 5 30000 03020100
  kill -CONT $gAgent
  # A gap shows with the next message that is received, and while the agent catches up there is no room for one.
  local lPosted=0
  wait_until 20 next_arrives
  expect_sum rscn 'were passed over' $((32000 + lPosted - 1))
  expect_text "something was lost" yes "$([ $gLost -gt 0 ] && echo yes)"
  expect_text "the socket's overrun is said" yes "$([ "$(lost 'overran')" -gt 0 ] && echo yes)"
}
next_arrives() {
  post_event $gTarget 5 1 03020100
  lPosted=$((lPosted + 1))
  collect
  [ "$(query "$(total rscn $gTargetName)")" = 1 ]
}

# Filters that add up the outcomes, and the check conditions without sense data.
all_outcomes() { echo '[.[] | select(.kind == "check-condition" or .kind == "device-busy" or .kind == "queue-full").occurrences] | add // 0'; }
without_sense() { echo '[.[] | select(.kind == "check-condition" and .data.senseKey == 4294967295).occurrences] | add // 0'; }

# expect_conserved EXPECTED: the outcomes that came and the outcomes that were reported as lost are exactly EXPECTED. The sense data of
# each check condition without them were reported as lost.
conserves() {
  collect
  gGot=$(query "$(all_outcomes)")
  gLost=$(lost 'SCSI outcomes are lost')
  gWithout=$(query "$(without_sense)")
  gLostSense=$(lost 'sense data are lost')
  [ $((gGot + gLost)) -ge $1 ]
}
expect_conserved() {
  wait_until 20 conserves $1
  usleep 2500000 # the library has looked once more: no more is lost
  conserves $1
  expect_text "outcomes: what came and what is said to be lost, together ($gGot, $gLost)" $1 $((gGot + gLost))
  expect_text "$gWithout without sense data, $gLostSense of which are said to be lost: no more than these" yes \
    "$([ $gWithout -le $gLostSense ] && echo yes)"
}

check_command_storm() { # a storm of failing commands is counted whole; where the trace buffers overrun, each loss is counted
  repeated 1 $(sg_of 1) 300 $gPastEnd
  expect_sum check-condition 'SCSI outcomes are lost' 300
  expect_text "of these, lost" 0 "$gLost"
  expect "without sense data" 0 "$(without_sense)"
  kill -STOP $gAgent
  shrink_buffers
  repeated 1 $(sg_of 1) 700 $gPastEnd
  kill -CONT $gAgent
  expect_conserved 1000
  expect_text "something was lost" yes "$([ $gLost -gt 0 ] && echo yes)"
}

# mixture SEED COUNT: so many lines "STATUS KEY ASC ASCQ TIMES" for the scripted LUN, in hexadecimal: half of them good, a third check
# conditions, the rest busy and task set full. The same seed gives the same lines.
mixture() {
  awk -v lSeed="$1" -v lCount="$2" 'BEGIN {
    srand(lSeed)
    lKeys = split("1 3 5 6 7", lKey, " ")
    lCodes = split("11 16 21 24 26 29 49", lCode, " ")
    while (lCount-- > 0) {
      lWhat = int(rand() * 6)
      if (lWhat < 3) print "00 0 0 0 0"
      else if (lWhat < 5) print "02", lKey[1 + int(rand() * lKeys)], lCode[1 + int(rand() * lCodes)], int(rand() * 4), 0
      else print (rand() < 0.5 ? "08" : "28"), 0, 0, 0, 1 + int(rand() * 3)
    }
  }'
}
send_mixture() {
  local lStatus lKey lAsc lAscq lTimes lDevice
  lDevice=$(sg_of 2)
  mixture $1 $2 | while read -r lStatus lKey lAsc lAscq lTimes; do
    scsi-repeat $lDevice 1 28 00 $lStatus $lKey $lAsc $lAscq $lTimes 00 00 00
  done
}
# What the target counts, and what has come: "KEY/ASC xTIMES [QUALIFIERS]" of each check condition, then busy and task set full.
answers() {
  awk '{n[$1]++}
    $1 == 2 {lName = $2 "/" $3; c[lName]++; q[lName, $4]}
    END {
      for (lName in c) {
        lText = lName " x" c[lName] " ["
        for (i = 0; i < 256; i++) if ((lName, i) in q) lText = lText (lText ~ /\[$/ ? "" : ",") i
        print lText "]"
      }
      printf "busy x%d, full x%d\n", n[8], n[40]
    }' $gAnswers | sort | tr '\n' ';'
}
outcomes() {
  query '(group_by([.data.senseKey, .data.asc])[] | map(select(.kind == "check-condition")) | select(length > 0) |
      "\(.[0].data.senseKey)/\(.[0].data.asc) x\(map(.occurrences) | add) [\(map(.data.ascqs[]) | unique | map(tostring) | join(","))]"),
    "busy x\([.[] | select(.kind == "device-busy").occurrences] | add // 0), full x\([.[] | select(.kind == "queue-full").occurrences] | add // 0)"' |
    sort | tr '\n' ';'
}
came_as_answered() {
  collect
  [ "$(outcomes)" = "$(answers)" ]
}

check_conservation() { # a seeded mix of good and failing commands: what the target has answered is what comes, each with its sense
  local lHits lConditions
  usleep 1500000 # outcomes of the scan for devices are over
  collect
  : >$gRecords
  : >$gAnswers
  lHits=$(probe_hits)
  send_mixture $gSeed $((120 * gFactor))
  wait_until 20 came_as_answered
  expect_text "seed $gSeed, $(grep -c . $gAnswers) commands" "$(answers)" "$(outcomes)"
  expect_text "lost" "0 0 0" \
    "$(lost 'SCSI outcomes are lost') $(lost 'sense data are lost') $(lost 'could not be read or handled')"
  lConditions=$(awk '$1 == 2 {n++} END {print n + 0}' $gAnswers)
  [ "$(records_of_one)" = 2 ] || lConditions=0 # there is no probe
  expect_text "hits of the probe: the check conditions, and no other command" $lConditions $(($(probe_hits) - lHits))
  # The same for a storm that the agent cannot read in time.
  kill -STOP $gAgent
  shrink_buffers
  send_storm $gSeed
  kill -CONT $gAgent
  expect_conserved $(awk '$1 != 0 {n++} END {print n + 0}' $gAnswers)
  expect_text "something was lost" yes "$([ $gLost -gt 0 ] && echo yes)"
}
# A seeded order of blocks of 40 commands each: check conditions, one busy and one task set full for each of another block.
send_storm() {
  awk -v lSeed="$1" 'BEGIN {
    srand(lSeed)
    for (lBlock = 0; lBlock < 12; lBlock++) {
      lWhat = int(rand() * 4)
      print (lWhat == 0 ? "08 0 0 0 1" : lWhat == 1 ? "28 0 0 0 1" : "02 5 2" int(rand() * 9) " 0 0")
    }
  }' | while read -r lStatus lKey lAsc lAscq lTimes; do
    scsi-repeat $(sg_of 2) 40 28 00 $lStatus $lKey $lAsc $lAscq $lTimes 00 00 00
  done
}

check_healthy() { # good commands, and those of other kinds of hosts, never reach the agent, however many there are
  local lRecorded lWakes
  modprobe scsi_debug max_luns=1 delay=0 ndelay=0
  wait_until 20 other_disk
  lRecorded=$(recorded)
  lWakes=$(agent_wakes)
  repeated 4 $(sg_of 0) 500 $gGood
  repeated 2 $(other_disk) 10000 $gGood
  expect_text "2000 good commands, 20000 of another host: records for the agent" 0 $(($(recorded) - lRecorded))
  lWakes=$(($(agent_wakes) - lWakes))
  expect_text "its wake-ups ($lWakes), fewer than one for 100 commands" yes "$([ $lWakes -lt 220 ] && echo yes)"
  repeated 1 $(other_disk) 100 $gPastEnd
  expect_text "100 failed ones of another host: records" 0 $(($(recorded) - lRecorded))
  repeated 1 $(sg_of 0) 1 $gPastEnd
  expect "events, after one failed command of the FC host" 1 '[.[].occurrences] | add'
  expect_text "records of it" $(records_of_one) $(($(recorded) - lRecorded))
  modprobe -r scsi_debug
}

fabric_up || exit 1
gCheck=fabric
lAll=$(sed -n 's/^check_\([a-z_]*\)().*/\1/p' /vm/sensor-checks.sh /vm/checks.sh /vm/change-checks.sh /vm/rights-checks.sh)
for gCheck in $(echo "${gOnly:-$lAll}" | tr , ' '); do
  lBegin=$(cut -d. -f1 /proc/uptime)
  if start_agent; then
    check_$gCheck >/dev/null
    stop_agent
    expect_text "the agent's end: status, trace instances" "0 0" "$gAgentStatus $(instances)"
    gAgent=
  else
    expect_text "the agent's start" started "$(tail -n 1 $gLog)"
  fi
  cp $gLog /out/$gCheck.log
  report time "$gCheck" "$(($(cut -d. -f1 /proc/uptime) - lBegin)) s"
done
exit $gBad
