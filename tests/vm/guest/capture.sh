# Records bytes of the kernel's interfaces into /out/KERNEL, which the host unpacks into tests/vm/captures: see the README there.
. /vm/fabric.sh
gOut=/out/$gKernel
gTracing=/sys/kernel/tracing
gInstance=$gTracing/instances/capture

# What a reader of these classes may want to know, of some hundred attributes.
gAttributes='node_name port_name port_id port_state port_type speed fabric_name symbolic_name model manufacturer roles scsi_target_id
  dev_loss_tmo fast_io_fail_tmo npiv_vports_inuse max_npiv_vports statistics/link_failure_count statistics/error_frames device/queue_depth
  device/state'

# copy_class CLASS DESTINATION: each entry's link, and the attributes of the device it leads to.
copy_class() {
  local lEntry lTo lDevice lName
  mkdir -p "$2/class/$1"
  for lEntry in /sys/class/$1/*; do
    cp -P "$lEntry" "$2/class/$1/"
    lDevice=$(readlink -f "$lEntry")
    lTo=$2${lDevice#/sys}
    mkdir -p "$lTo"
    cp -P "$lDevice/device" "$lTo/" 2>/dev/null
    for lName in $gAttributes; do
      if cat "$lDevice/$lName" >/tmp/attribute 2>/dev/null; then
        mkdir -p "$(dirname "$lTo/$lName")"
        cp /tmp/attribute "$lTo/$lName"
      fi
    done
  done
}
copy_state() {
  local lClass
  for lClass in fc_host fc_remote_ports fc_transport scsi_device; do copy_class $lClass "$gOut/$1"; done
}

# traced NAME EVENTS FILTER COMMAND...: the ring-buffer pages and the kernel's own text of what the command caused.
traced() {
  local lName=$1 lEvents=$2 lFilter=$3 lEvent
  shift 3
  mkdir -p $gInstance "$gOut/tracing/pages"
  echo 8 >$gInstance/buffer_size_kb
  for lEvent in $lEvents; do
    [ -z "$lFilter" ] || echo "$lFilter" >$gInstance/events/scsi/$lEvent/filter
    echo 1 >$gInstance/events/scsi/$lEvent/enable
  done
  "$@" >/dev/null 2>&1
  for lEvent in $lEvents; do echo 0 >$gInstance/events/scsi/$lEvent/enable; done
  grep -v '^#  \|^#$' $gInstance/trace | head -n 12 >"$gOut/tracing/pages/$lName.txt"
  fc-capture pages $gInstance/per_cpu/cpu0/trace_pipe_raw "$gOut/tracing/pages/$lName.bin"
  rmdir $gInstance
}

# message NAME COMMAND...: the FC messages that the command caused, as NAME.bin, NAME-2.bin ...
message() {
  local lName=$1 lCount lFile lNumber=1
  shift
  lCount=$(wc -l </tmp/messages/index)
  "$@" >/dev/null 2>&1
  wait_until 5 more_messages "$lCount" || echo "capture: no message of $lName" >&2
  usleep 300000
  tail -n +$((lCount + 1)) /tmp/messages/index | while read -r lFile lRest; do
    cp "/tmp/messages/$lFile" "$gOut/netlink/$lName$([ $lNumber = 1 ] || echo -$lNumber).bin"
    echo "$lName$([ $lNumber = 1 ] || echo -$lNumber).bin $lRest" >>"$gOut/netlink/index"
    lNumber=$((lNumber + 1))
  done
}
more_messages() { [ "$(wc -l </tmp/messages/index)" -gt "$1" ]; }

link_lost_under_load() {
  sg_raw $(sg_of 2) 28 00 ff 00 00 00 00 00 00 00 &
  usleep 500000
  link_cycle
  wait $!
}
link_cycle() { set_link veth0 down && wait_until 60 host_is $gInitiator Linkdown; }
link_back() {
  set_link veth0 up
  wait_until 60 host_is $gInitiator Online
  fabric_wait
}
several_outcomes() {
  past_end 0
  usleep 200000
  unknown_command 1
  answered 2 0 02 06 29 03
  past_end 300
}
many() {
  local lTimes=180
  while [ $lTimes -gt 0 ]; do
    echo 28 00 0f ff ff ff 00 00 01 00
    lTimes=$((lTimes - 1))
  done | xargs -n 10 sg_raw $(sg_of 1)
}

fabric_up || exit 1
rm -rf "$gOut"
mkdir -p "$gOut/netlink" "$gOut/tracing/events/scsi" /tmp/messages
uname -r >"$gOut/release"

for lEvent in scsi_dispatch_cmd_start scsi_dispatch_cmd_done scsi_dispatch_cmd_error scsi_dispatch_cmd_timeout scsi_eh_wakeup; do
  mkdir -p "$gOut/tracing/events/scsi/$lEvent"
  cat $gTracing/events/scsi/$lEvent/format >"$gOut/tracing/events/scsi/$lEvent/format"
  cat $gTracing/events/scsi/$lEvent/id >"$gOut/tracing/events/scsi/$lEvent/id"
done
cat $gTracing/events/header_page >"$gOut/tracing/events/header_page"
cat $gTracing/events/header_event >"$gOut/tracing/events/header_event"

copy_state sysfs-online

traced check-conditions scsi_dispatch_cmd_done 'result != 0' several_outcomes
traced queue-full scsi_dispatch_cmd_done 'result != 0' answered 2 02 28
traced busy scsi_dispatch_cmd_done 'result != 0' answered 2 02 08
traced reservation-conflict scsi_dispatch_cmd_done 'result != 0' answered 2 0 18
traced start-and-done 'scsi_dispatch_cmd_start scsi_dispatch_cmd_done' '' several_outcomes
traced overrun scsi_dispatch_cmd_done '' many
traced timeout 'scsi_dispatch_cmd_timeout scsi_dispatch_cmd_error' '' sg_raw -t 1 $(sg_of 2) 28 00 ff 00 00 00 00 00 00 00

for lPort in /sys/class/fc_remote_ports/*; do
  echo 8 >$lPort/dev_loss_tmo
  echo 3 >$lPort/fast_io_fail_tmo
done
fc-capture netlink /tmp/messages &
lCapture=$!
wait_until 5 [ -e /tmp/messages/index ]
message lip issue_lip
fabric_wait
message post-link-up post_event $gInitiator 2 1 00000000
message post-link-down post_event $gInitiator 3 1 00000000
message post-rscn-port post_event $gInitiator 5 1 03020100
message post-rscn-fabric post_event $gInitiator 5 1 00000003
message post-adapter-change post_event $gInitiator 103 1 00000000
message post-port-offline post_event $gInitiator 201 1 00000000
message post-no-data post_event $gInitiator 5 1
message post-fpin post_event $gInitiator 501 1 16000000000000240002000100000000200002000000000210000200000000010003000000000001
message post-vendor post_event $gInitiator ffff 1 0102030405060708090a0b0c
message forged fc-capture forge 3
message link-down link_cycle
copy_state sysfs-linkdown
link_back
traced disrupted 'scsi_dispatch_cmd_done scsi_dispatch_cmd_error' '' link_lost_under_load
link_back
kill $lCapture
