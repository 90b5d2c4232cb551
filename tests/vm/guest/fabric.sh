# Two FC ports that see each other, made of the kernel's software FC stack over a pair of virtual network cards, and a target
# with LUNs on the second one. Sourced by what runs in the guest.

gInitiatorName=2000020000000001 # port name of the initiator's end
gInitiatorNode=1000020000000001
gTargetName=2000020000000002 # port name of the target's end
gTargetNode=1000020000000002

colons() { echo "$1" | sed 's/../&:/g; s/:$//'; }

# wait_until SECONDS COMMAND...: until the command succeeds; fails when the time is over.
wait_until() {
  local lEnd=$(($(date +%s) + $1 + 1))
  shift
  until "$@" 2>/dev/null; do
    [ "$(date +%s)" -lt $lEnd ] || return 1
    usleep 50000
  done
}

# host_of PORTNAME: the number of the FC host with that name.
host_of() {
  local lFile
  for lFile in /sys/class/fc_host/host*/port_name; do
    if [ "$(cat "$lFile")" = "0x$1" ]; then
      lFile=${lFile%/port_name}
      echo "${lFile##*/host}"
      return
    fi
  done
  return 1
}

host_state() { cat "/sys/class/fc_host/host$1/port_state"; }
host_is() { [ "$(host_state "$1")" = "$2" ]; }

# The remote port that the initiator sees as the target, as a directory.
target_port() {
  local lPort
  for lPort in /sys/class/fc_remote_ports/rport-$gInitiator:*; do
    if [ "$(cat "$lPort/port_name")" = "0x$gTargetName" ]; then
      echo "$lPort"
      return
    fi
  done
  return 1
}
target_is() { [ "$(cat "$(target_port)/port_state")" = "$1" ]; }

# lun_device LUN KIND: the node of that LUN at the initiator; KIND is block or scsi_generic.
lun_device() {
  local lPath
  for lPath in /sys/class/fc_host/host$gInitiator/device/rport-*/target*/*:*:*:$1/$2/*; do
    [ -e "$lPath" ] && echo "/dev/${lPath##*/}" && return
  done
  return 1
}
sg_of() { lun_device "$1" scsi_generic; }
# Its disk comes last: the kernel asks the LUN for its size first, and does so beside other work.
lun_is_there() { sg_of "$1" >/dev/null && lun_device "$1" block >/dev/null; }

controller() { echo /sys/class/net/$1/ctlr_*; }
set_link() { /vm/bin/ip link set "$1" "$2"; }

gAnswers=/tmp/answers # what the scripted LUN has answered, one line an answer: status, sense key, asc, ascq
gConfig=/sys/kernel/config/target
gGroup=$gConfig/fc/$(colons $gTargetName)/tpgt_1
gAccess=$gGroup/acls/$(colons $gInitiatorName)

# backstore_memory LUN, backstore_scripted LUN: make what is behind a LUN and print its directory under target/core.
backstore_memory() {
  local lStore=rd_mcp_$1/memory
  mkdir -p $gConfig/core/$lStore
  echo rd_pages=256 >$gConfig/core/$lStore/control
  echo 1 >$gConfig/core/$lStore/enable
  echo "memory-$1" >$gConfig/core/$lStore/wwn/vpd_unit_serial
  echo $lStore
}
backstore_scripted() {
  local lStore=user_$1/scripted lDevice
  mkdir -p $gConfig/core/$lStore
  echo "dev_config=scripted/$1,dev_size=1048576,hw_block_size=512,nl_reply_supported=-1" >$gConfig/core/$lStore/control
  echo 1 >$gConfig/core/$lStore/enable
  lDevice=$(dirname "$(grep -l "^tcm-user/$1/" /sys/class/uio/uio*/name)")
  scripted-target "/dev/${lDevice##*/}" "$(cat "$lDevice/maps/map0/size")" $gAnswers >/dev/null 2>/dev/kmsg &
  echo $lStore
}

# lun_map LUN BACKSTORE, lun_unmap LUN: the initiator is, or is no longer, given that LUN.
lun_map() {
  mkdir $gGroup/lun/lun_$1
  ln -s $gConfig/core/$2 $gGroup/lun/lun_$1/backstore
  mkdir $gAccess/lun_$1
  ln -s $gGroup/lun/lun_$1 $gAccess/lun_$1/lun
}
lun_unmap() {
  rm $gAccess/lun_$1/lun
  rmdir $gAccess/lun_$1
  rm $gGroup/lun/lun_$1/backstore
  rmdir $gGroup/lun/lun_$1
}

# A target at the second port: LUNs 0, 1 and 300 are memory, LUN 2 answers as it is told.
target_create() {
  modprobe -a tcm_fc target_core_user
  mkdir -p $gConfig/fc
  mkdir -p $gGroup $gAccess
  lun_map 0 $(backstore_memory 0)
  lun_map 1 $(backstore_memory 1)
  lun_map 2 $(backstore_scripted 2)
  lun_map 300 $(backstore_memory 300)
}

# Stimuli at the initiator. answered LUN TIMES STATUS [KEY ASC ASCQ], in hexadecimal: the scripted LUN gives that answer to a READ(10)
# that many times (0: once, and no repetition is waited for). past_end LUN: a READ(10) past the end. unknown_command LUN.
answered() { sg_raw -t 20 $(sg_of $1) 28 00 $3 ${4:-0} ${5:-0} ${6:-0} $2 00 00 00; }
past_end() { sg_raw $(sg_of $1) 28 00 0f ff ff ff 00 00 01 00; }
unknown_command() { sg_raw $(sg_of $1) ee 00 00 00 00 00; }
issue_lip() { echo 1 >/sys/class/fc_host/host$gInitiator/issue_lip; }
# post_event HOST CODE TIMES [HEXBYTES]: the transport class posts an FC event.
post_event() {
  [ -d /sys/module/fc_post ] || insmod /vm/fc_post.ko
  echo "$*" >/sys/module/fc_post/parameters/post
}
# name_host HOST NAME: the host's port name as sysfs shows it.
name_host() {
  [ -d /sys/module/fc_post ] || insmod /vm/fc_post.ko
  echo "$*" >/sys/module/fc_post/parameters/port_name
}

# port_create CARD: an FC port over that card.
port_create() {
  echo $1 >/sys/bus/fcoe/ctlr_create
  echo VN2VN >$(controller $1)/mode
  echo 1 >$(controller $1)/enabled
}

# fabric_wait: until the initiator sees the target and its LUNs.
fabric_wait() {
  local lLun
  wait_until 60 target_is Online || return 1
  for lLun in 0 1 2 300; do wait_until 60 lun_is_there $lLun || return 1; done
}

# fabric_up: sets gInitiator and gTarget, the numbers of the two hosts.
fabric_up() {
  modprobe -a fcoe veth sd_mod sg
  /vm/bin/ip link add veth0 mtu 2500 address 02:00:00:00:00:01 type veth peer name veth1 mtu 2500 address 02:00:00:00:00:02
  set_link veth0 up
  set_link veth1 up
  target_create
  port_create veth0
  port_create veth1
  gInitiator=$(wait_until 60 host_of $gInitiatorName) && gTarget=$(wait_until 60 host_of $gTargetName) && fabric_wait ||
    { echo "fabric: the ports do not see each other" >&2; return 1; }
}
