# What scripts/demo --vm shows: real FC ports of this kernel, an agent that uses them, and the events that it collects.
. /vm/agent.sh
exec 3>/dev/ttyS1

gStep=0
step() {
  gStep=$((gStep + 1))
  printf '\n[%d] %s\n' $gStep "$*" >&3
}
show() { sed 's/^/    /' >&3; }

step "Linux $(uname -r) boots; two FC ports of its software stack see each other, one of them with a target of four LUNs"
fabric_up || exit 1
for lHost in $gInitiator $gTarget; do
  echo "host$lHost: $(cat /sys/class/fc_host/host$lHost/port_name), $(host_state $lHost)"
done | show
for lLun in 0 1 2 300; do echo "LUN $lLun: $(sg_of $lLun)"; done | show

step "Starting the agent with the library over the kernel's FC transport; a sensor names the ports and says start"
start_agent || exit 1
{ logged 'Discovered QRV'; logged 'cannot deliver'; } | show

step "The target's LUN 2 answers twelve reads with TASK SET FULL and three with BUSY; reads of LUNs 0 and 1 go past the end"
answered 2 0c 28
answered 2 3 08
for lLun in 0 1 1; do past_end $lLun; done 2>/dev/null
answered 2 0 02 06 29 00 2>/dev/null

step "sensor -> agent: get"
tavikctl get | tee /tmp/first | show

step "The cable of the initiator's port is pulled and plugged in again; then the driver of a port reports an RSCN"
set_link veth0 down
wait_until 60 host_is $gInitiator Linkdown
set_link veth0 up
fabric_wait
post_event $gInitiator 5 1 03020100
wait_until 5 [ "$(logged 'Processing LINK' | wc -l)" -ge 4 ]

step "sensor -> agent: get"
tavikctl get | tee /tmp/second | show

step "sensor -> agent: shutdown; the library gives back its trace instance"
stop_agent
echo "agent: status $gAgentStatus; trace instances: $(instances)" | show

grep -q 'queue-full .* 12 ' /tmp/first && grep -q 'device-busy .* 3 ' /tmp/first && grep -q ' check-condition ' /tmp/first &&
  grep -q ' link ' /tmp/second && grep -q ' rscn .*fcAddress=0x010203' /tmp/second && [ "$gAgentStatus $(instances)" = "0 0" ]
