# The checks of LUNs, hosts, ports, processors and agents that come and go. Sourced by checks.sh, whose functions it uses.

check_unmapped() { # a LUN that is taken away answers with check conditions of its own LUN
  lun_unmap 1
  unknown_command 1
  unknown_command 1
  expect "after the unit attention" "$(sense 5 37)" \
    '[.[] | select(.kind == "check-condition" and .data.luns == [1])] | last | "key=\(.data.senseKey) asc=\(.data.asc)"'
  lun_map 1 rd_mcp_1/memory
  unknown_command 1
}

check_gone() { # a host that is removed is a link event; one of the same name that comes has its board again
  echo veth0 >/sys/bus/fcoe/ctlr_destroy
  expect "gone" 1 "$(total link)"
  # The other end notices too, which lets it find the new host without waiting for its own timers.
  set_link veth0 down
  set_link veth0 up
  port_create veth0
  wait_until 60 host_of $gInitiatorName
  gInitiator=$(host_of $gInitiatorName)
  expect "back: every board hears of it" "1 1" "[($(total adapter-arrival)), ($(total adapter-arrival $gTargetName)) | tostring] | join(\" \")"
  fabric_is_ready
  : >$gRecords
  past_end 1
  post_event $gInitiator 5 1 03020100
  expect "its SCSI outcomes" true "$(reads_fail 1)"
  expect "its messages" 1 "$(total rscn)"
}

check_device_loss() { # a remote port that was given up and comes back is known by its name again
  echo 2 >"$(target_port)/dev_loss_tmo"
  set_link veth0 down
  wait_until 60 target_is 'Not Present'
  expect_text "the target" "Not Present" "$(cat "$(target_port)/port_state")"
  set_link veth0 up
  fabric_is_ready
  past_end 1
  expect "a failed command" true "$(reads_fail 1)"
  expect "the port of all check conditions" "$(colons $gTargetName)" \
    '[.[] | select(.kind == "check-condition").data.portName] | unique | join(" ")'
}

check_vport() { # a virtual port that is made while the agent runs has arrived
  echo 20000200000000aa:10000200000000aa >/sys/class/fc_host/host$gInitiator/vport_create
  wait_until 60 host_of 20000200000000aa
  expect "every board hears of it" "1 1" "[($(total adapter-arrival)), ($(total adapter-arrival $gTargetName)) | tostring] | join(\" \")"
  echo 20000200000000aa:10000200000000aa >/sys/class/fc_host/host$gInitiator/vport_delete
  expect_logged "and when it goes" "-N- board 2: its host is gone" "its host is gone"
}

check_processor() { # outcomes on a processor that comes up while the agent runs are seen, also one that was taken off and is back
  stop_agent
  echo 0 >/sys/devices/system/cpu/cpu1/online
  start_agent
  echo 1 >/sys/devices/system/cpu/cpu1/online
  local lTimes=0
  while [ $lTimes -lt 10 ]; do
    taskset $((lTimes % 2 + 1)) scsi-repeat $(sg_of 1) 4 28 00 0f ff ff ff 00 00 01 00
    lTimes=$((lTimes + 1))
  done
  expect "check conditions" 40 "$(total check-condition)"
  taskset 2 scsi-repeat $(sg_of 1) 10 $gPastEnd
  echo 0 >/sys/devices/system/cpu/cpu1/online
  scsi-repeat $(sg_of 1) 10 $gPastEnd
  echo 1 >/sys/devices/system/cpu/cpu1/online
  taskset 2 scsi-repeat $(sg_of 1) 10 $gPastEnd
  expect "and 30 before, while and after it was off" 70 "$(total check-condition)"
}

check_two() { # two agents of one machine see the same and leave each other alone
  local lFirst
  lFirst=$(ls $gTracing/instances)
  mkdir -m 0700 /tmp/second
  (
    export ZT_QRV_SENSOR_DIR=/tmp/second
    qrv-tvk -D false -l /tmp/second/agent.log &
    tavikctl --wait start
    past_end 0
    wait_until 10 grep -q 'Processing CHECKCOND' /tmp/second/agent.log
    tavikctl shutdown
    wait
  ) >/dev/null 2>&1
  expect "the first sees it" 1 "$(total check-condition)"
  expect_text "the second saw it" 1 "$(grep -c 'Processing CHECKCOND' /tmp/second/agent.log)"
  expect_text "the first's instance" "$lFirst" "$(ls $gTracing/instances)"
}
