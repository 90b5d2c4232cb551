# The checks of what ends an agent, of what it leaves behind, and of what the host does not grant it. Sourced by checks.sh, whose
# functions it uses. The last of them leaves a kernel that grants nothing more.

check_killed() { # what a killed agent leaves in tracefs, the next one removes
  local lFirst
  lFirst=$(ls $gTracing/instances)
  expect_text "instances of its own" $(records_of_one) "$(instances)"
  kill -9 $gAgent
  wait $gAgent 2>/dev/null
  expect_text "left by the killed one" "$lFirst" "$(ls $gTracing/instances)"
  start_agent
  expect_text "as many instances, and none of those" "$(records_of_one) 0" \
    "$(instances) $(ls $gTracing/instances | grep -cxF "$lFirst")"
  past_end 0
  expect "the next one delivers" 1 "$(total check-condition)"
}

check_killed_in_a_storm() { # nothing is left of an agent that is killed in a storm, once the next one has been there
  local lStorm
  stop_agent
  export KPM_LINUX_PROBE=1
  start_agent
  repeated 2 $(sg_of 1) 400 $gPastEnd &
  lStorm=$!
  usleep 300000
  kill -9 $gAgent
  wait $gAgent 2>/dev/null
  wait $lStorm
  start_agent
  expect_text "instances and probes of the next one" "2 1" "$(instances) $(grep -c scsi_check_sense $gTracing/kprobe_events)"
  past_end 0
  expect "the next one delivers" 1 "$(total check-condition)"
  stop_agent
  unset KPM_LINUX_PROBE
  expect_text "instances and probes after it" "0 0" "$(instances) $(grep -c scsi_check_sense $gTracing/kprobe_events)"
  start_agent
}

check_terminated() { # an agent that a signal ends leaves its trace instance switched off, and the next one removes it
  local lFirst
  stop_agent
  export KPM_LINUX_PROBE=1
  start_agent
  unset KPM_LINUX_PROBE
  lFirst=$(outcomes_instance)
  expect_text "the trace event and the probe while it runs" "1 1" "$(events_on)"
  kill -TERM $gAgent
  wait $gAgent
  expect_text "its status" 0 $?
  expect_text "the trace event and the probe after it" "0 0" "$(events_on)"
  start_agent
  expect_text "left by the next one" "" "$(ls -d "$lFirst" 2>/dev/null)"
}
events_on() {
  echo $(cut -c1 $(outcomes_instance)/events/scsi/scsi_dispatch_cmd_done/enable \
    $gTracing/instances/*sense*/events/libkpm_linux_*/check_sense/enable)
}

check_no_tracefs() { # without tracefs there are no SCSI outcomes, the log says why, and messages come
  stop_agent
  umount $gTracing
  umount /sys/kernel/debug
  start_agent
  expect_reason "why" "no SCSI outcomes: there is no tracefs at $gTracing: No such file or directory"
  post_event $gInitiator 5 1 03020100
  expect "messages" 1 "$(total rscn)"
  mount -t tracefs tracefs $gTracing
  mount -t debugfs debugfs /sys/kernel/debug
}

check_read_only_tracefs() { # with a tracefs that cannot be changed it is the same
  stop_agent
  mount -o remount,ro $gTracing
  start_agent
  expect_reason "why" "no SCSI outcomes: the trace instance PATH cannot be made: Read-only file system"
  post_event $gInitiator 5 1 03020100
  expect "messages" 1 "$(total rscn)"
  mount -o remount,rw $gTracing
}

check_no_network_rights() { # without the right to listen there are no messages, the log says why, and SCSI outcomes come
  stop_agent
  start_agent /vm/bin/setpriv --bounding-set -net_admin --inh-caps -net_admin
  expect_reason "why" "no RSCNs, and link states only every 2000 ms: FC events cannot be subscribed to: Operation not permitted"
  past_end 0
  expect "SCSI outcomes" 1 "$(total check-condition)"
}

check_nobody() { # a user without rights has links, by polling
  stop_agent
  start_agent /vm/bin/setpriv --reuid 65534 --clear-groups --inh-caps -all
  expect_reason "why there are no outcomes" "no SCSI outcomes: no tracefs can be reached at $gTracing: Permission denied"
  expect_reason "why there are no messages" \
    "no RSCNs, and link states only every 2000 ms: FC events cannot be subscribed to: Operation not permitted"
  set_link veth0 down
  expect "link down" 1 "$(total link)"
  set_link veth0 up
  expect "and up" 2 "$(total link)"
  fabric_is_ready
}

# Starts the agent as an ordinary user with these capabilities.
as_user() { start_agent /vm/bin/setpriv --reuid 65534 --clear-groups --inh-caps "-all,$1" --ambient-caps "$1"; }

# everything_comes: a check condition with its sense data, and a message.
everything_comes() {
  past_end 0
  expect "a check condition with sense data" "n=1 key=5 asc=33" \
    '[.[] | select(.kind == "check-condition") | "n=\(.occurrences) key=\(.data.senseKey) asc=\(.data.asc)"] | join("; ")'
  post_event $gInitiator 5 1 03020100
  expect "a message" 1 "$(total rscn)"
  expect_text "the library's warnings" "" "$(grep -e '-W-.*Libkpm: ' $gLog)"
}

check_prepared() { # an ordinary user with CAP_NET_ADMIN alone, where root has prepared tracefs, has everything
  stop_agent
  tavik-tracefs prepare 65534
  as_user +net_admin
  everything_comes
  kill -9 $gAgent
  wait $gAgent 2>/dev/null
  : >$gRecords
  as_user +net_admin
  expect_text "instances after a killed one and its next" $(records_of_one) "$(instances)"
  past_end 0
  expect "the next one delivers" 1 "$(total check-condition)"
  stop_agent
  tavik-tracefs undo
  expect_text "tracefs afterwards" "700 0 0 0" \
    "$(stat -c '%a %u' $gTracing) $(stat -c %u $gTracing/instances) $(grep -c libkpm_linux $gTracing/kprobe_events)"
  start_agent
}

check_instance() { # an ordinary user has everything from instances that root has made for it, which stay
  local lProbe lInstance
  stop_agent
  lProbe=$(kpm-sense-probe)
  [ -z "$lProbe" ] || echo "$lProbe" >>$gTracing/kprobe_events
  chmod 711 $gTracing
  chmod 755 $gTracing/instances
  for lInstance in ours ours-sense; do
    mkdir $gTracing/instances/$lInstance
    chown -R 65534 $gTracing/instances/$lInstance
  done
  export KPM_LINUX_INSTANCE=$gTracing/instances/ours
  as_user +net_admin
  everything_comes
  stop_agent
  unset KPM_LINUX_INSTANCE
  expect_text "the instances after it" "ours ours-sense" "$(echo $(ls $gTracing/instances))"
  rmdir $gTracing/instances/ours $gTracing/instances/ours-sense
  chmod 700 $gTracing
  [ -z "$lProbe" ] || kpm-sense-probe remove >>$gTracing/kprobe_events
  start_agent
}

check_capabilities() { # an ordinary user with capabilities alone has everything
  stop_agent
  as_user +net_admin,+dac_override
  everything_comes
}

check_namespace() { # in a network namespace of its own the agent says that no messages can come, and has the rest
  stop_agent
  start_agent unshare -n
  expect_reason "why" "no RSCNs, and link states only every 2000 ms: this process is in a network namespace of its own, where the kernel sends no FC events"
  past_end 0
  expect "SCSI outcomes" 1 "$(total check-condition)"
}

check_late_name() { # a host whose driver names it late is held back and gets its board then
  stop_agent
  name_host $gInitiator ffffffffffffffff
  start_agent
  expect_logged "held back" "-N- host$gInitiator has no port name yet: it becomes a board when sysfs shows its name" "no port name"
  name_host $gInitiator $gInitiatorName
  wait_until 20 is_a_board
  expect_text "its board" yes "$(is_a_board && echo yes)"
  expect "the other board hears of it" 1 "$(total adapter-arrival $gTargetName)"
  expect_text "no board was lost" "" "$(logged 'its host is gone')"
}
is_a_board() { logged "board 1 is host$gInitiator," | grep -q .; }

check_lockdown() { # where the kernel is locked down there are no SCSI outcomes, and messages come; this has no way back
  stop_agent
  post_event $gInitiator 5 1 03020100
  mount -t securityfs securityfs /sys/kernel/security
  echo confidentiality >/sys/kernel/security/lockdown
  start_agent
  expect_reason "why" "no SCSI outcomes: the trace instance PATH cannot be made: Invalid argument"
  post_event $gInitiator 5 1 03020100
  expect "messages" 1 "$(total rscn)"
}
