# What scripts/test-vm --figures prints: the agent's cost on this machine while no events happen, and how large a storm has to be before
# events are lost.
. /vm/agent.sh
exec 3>/dev/ttyS1

# ratio A B [PLACES]
ratio() { awk "BEGIN {printf \"%.${3:-2}f\", $1 / $2}"; }

# costs WHAT COMMANDS COMMAND...: prints one line with the agent's cost while the command runs. The command makes COMMANDS SCSI commands.
costs() {
  local lWhat=$1 lCommands=$2 lRecorded lTime lWakes lBegin lTook
  shift 2
  lRecorded=$(recorded)
  lTime=$(agent_time)
  lWakes=$(agent_wakes)
  lBegin=$(now)
  "$@"
  lTook=$(($(now) - lBegin))
  lWakes=$(($(agent_wakes) - lWakes))
  lTime=$(($(agent_time) - lTime))
  printf '%-44s %9s %10s %9s %9s\n' "$lWhat" "$(ratio $((lCommands * 1000)) $lTook 0)" \
    "$(ratio $lTime $((lTook * 1000)))" "$(ratio $((lWakes * 1000)) $lTook 1)" $(($(recorded) - lRecorded)) >&3
}

# all_came KIND EXPECTED LOSS: collects until the events that came (gCame) and those reported as lost (gLost) are EXPECTED together.
all_came() {
  collect
  gCame=$(query "$(total $1)")
  gLost=$(($(lost "$3") - gLostBefore))
  [ $((gCame + gLost)) -ge $2 ]
}
# storm WHAT KIND LOSS EVENTS COMMAND...: the line of a storm that the agent reads as it comes.
storm() {
  local lWhat=$1 lKind=$2 lLoss=$3 lEvents=$4 lBegin lTime lTook
  shift 4
  collect
  : >$gRecords
  gLostBefore=$(lost "$lLoss")
  lTime=$(agent_time)
  lBegin=$(now)
  "$@"
  lTook=$(($(now) - lBegin))
  wait_until 60 all_came $lKind $lEvents "$lLoss"
  lTime=$(($(agent_time) - lTime))
  printf '%-44s %9s %10s %9s %9s\n' "$lWhat" "$(ratio $((lEvents * 1000)) $lTook 0)" "$(ratio $lTime $((lEvents * 1000)))" \
    $gCame $gLost >&3
}

# unread WHAT KIND LOSS EVENTS COMMAND...: the same while the agent is stopped.
unread() {
  local lWhat=$1 lKind=$2 lLoss=$3 lEvents=$4
  shift 4
  collect
  : >$gRecords
  gLostBefore=$(lost "$lLoss")
  kill -STOP $gAgent
  "$@"
  kill -CONT $gAgent
  usleep 5000000
  post_event $gTarget 500 1 00000000 # the gap in the messages' numbers shows with the next one
  wait_until 60 all_came $lKind $lEvents "$lLoss"
  printf '%-44s %9s %10s %9s %9s\n' "$lWhat" "" "" $gCame $gLost >&3
}

on_one_processor() { taskset 1 scsi-repeat $(sg_of 1) $1 $gPastEnd; }
rscns() { post_event $gInitiator 5 $1 03020100; }

fabric_up || exit 1
modprobe scsi_debug max_luns=1 delay=0 ndelay=0
wait_until 20 other_disk
start_agent || exit 1
printf 'Linux %s, %s processors, emulated\n\n' "$(uname -r)" "$(processors)" >&3
printf '%-44s %9s %10s %9s %9s\n' "" commands/s "agent ms/s" wakes/s records >&3
costs "idle" 0 usleep 20000000
costs "good commands of the FC host" 40000 repeated 8 $(sg_of 0) 5000 $gGood
costs "good commands of another host" 200000 repeated 2 $(other_disk) 100000 $gGood
echo 'result & 42' >$(outcomes_instance)/events/scsi/scsi_dispatch_cmd_done/filter
costs "the same with no host in the filter" 200000 repeated 2 $(other_disk) 100000 $gGood
printf '\n%-44s %9s %10s %9s %9s\n' "" events/s "us an event" came lost >&3
failed_commands() { storm "$1" check-condition 'SCSI outcomes are lost' 8000 repeated 8 $(sg_of 1) 1000 $gPastEnd; }
failed_commands "failed commands of the FC host"
storm "RSCNs, 2000 at once" rscn 'were passed over' 2000 rscns 2000
unread "outcomes on one processor, agent stopped" check-condition 'SCSI outcomes are lost' 5000 on_one_processor 5000
unread "RSCNs, agent stopped" rscn 'were passed over' 20000 rscns 20000
stop_agent
[ "$gAgentStatus" = 0 ] || exit 1

# The probe for sense data, and none, in turn: gRounds rounds of each, and of each column the median.
gRounds=5
median() { sort -n | sed -n "$((gRounds / 2 + 1))p"; }

# round: one storm of failed commands. gAgentEach and gAllEach: microseconds of processor time for an outcome, of the agent and of
# all there is, the sender and the target included.
round() {
  local lAgent lAll
  collect
  : >$gRecords
  gLostBefore=$(lost 'SCSI outcomes are lost')
  lAgent=$(agent_time)
  lAll=$(busy_time)
  repeated 1 $(sg_of 1) 2000 $gPastEnd
  usleep 1500000 # the agent has read and matched all
  gAgentEach=$(ratio $(($(agent_time) - lAgent)) 2000000)
  gAllEach=$(ratio $(($(busy_time) - lAll)) 2000000)
  wait_until 60 all_came check-condition 2000 'SCSI outcomes are lost'
}

lTaken=/tmp/taken
rm -rf $lTaken
mkdir $lTaken
for lRound in $(seq $gRounds); do
  for lProbe in 1 0; do
    export KPM_LINUX_PROBE=$lProbe
    start_agent || exit 1
    lHits=$(probe_hits)
    [ $lRound -gt 1 ] || repeated 8 $(sg_of 0) 1000 $gGood
    lGood=$(($(probe_hits) - lHits))
    lHits=$(probe_hits)
    round
    lFailed=$(($(probe_hits) - lHits))
    [ $lRound -gt 1 ] || echo "$lGood $lFailed $gCame $gLost" >$lTaken/first-$lProbe
    echo $gAgentEach >>$lTaken/agent-$lProbe
    echo $gAllEach >>$lTaken/all-$lProbe
    stop_agent
    [ "$gAgentStatus" = 0 ] || exit 1
  done
done
printf '\n%-44s %9s %10s %9s %9s\n' "2000 failed commands, medians of $gRounds rounds" "agent us" "all us" came lost >&3
for lProbe in 1 0; do
  [ $lProbe = 1 ] && lWith="with the probe" || lWith="without a probe"
  read -r lGood lFailed gCame gLost <$lTaken/first-$lProbe
  printf '%-44s %9s %10s %9s %9s\n' "$lWith" $(median <$lTaken/agent-$lProbe) $(median <$lTaken/all-$lProbe) $gCame $gLost >&3
  printf '%-44s %9s %10s\n' "  its rounds, from the least to the most" "$(sort -n $lTaken/agent-$lProbe | sed -n '1p;$p' | tr '\n' ' ')" \
    "$(sort -n $lTaken/all-$lProbe | sed -n '1p;$p' | tr '\n' ' ')" >&3
  printf '  hits of the probe by 8000 good commands: %s, by 2000 failed ones: %s\n' $lGood $lFailed >&3
done
