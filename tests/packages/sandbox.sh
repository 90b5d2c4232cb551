# Probes for each line of the unit's sandbox: sourced, after service-checks.sh. A probe is a command that is run twice, under
# systemd: with only this line, and without it. One of the two must fail. This shows that this line has the effect, and no other.
# The numbers of system calls are those of x86-64.

# run_probe USER COMMAND PROPERTY...: as a service of its own with those properties; the command's status.
run_probe() {
  lUser=$1 lCommand=$2
  shift 2
  for lProperty in "$@"; do
    set -- "$@" -p "$lProperty"
    shift
  done
  systemd-run --quiet --wait --collect --pipe -p User="$lUser" "$@" bash -c "$lCommand" >/tmp/probe.out 2>&1 </dev/null
}
says_whether() { run_probe "$@" && echo works || echo fails; }

# forbids LINE USER COMMAND PROPERTY...: the command works with the properties alone, and fails with the line too.
# allows LINE ...: the other way round.
forbids() { compare_probe "works without, fails with it" "$@"; }
allows() { compare_probe "fails without, works with it" "$@"; }
compare_probe() {
  lExpected=$1 lLine=$2 lProbeUser=$3 lProbe=$4
  shift 4
  lWithout=$(says_whether "$lProbeUser" "$lProbe" "$@")
  expect "$lLine: $lProbe" "$lExpected" "$lWithout without, $(says_whether "$lProbeUser" "$lProbe" "$@" "$lLine") with it"
}

# If a container itself forbids something, a probe shows nothing about the unit. Such probes run only in a virtual machine.
on_machine() { systemd-detect-virt --quiet --container || "$@"; }

prepare_probes() {
  mkdir -p /opt/probe /usr/lib/modules/probe
  touch /opt/probe/file /root/probe /tmp/probe
  chmod 755 /opt/probe/file
  install -m 4755 /usr/bin/id /opt/probe/id
  # A program of 64 bits that ends with 0 by a system call of 32 bits, or else with 1.
  perl -e '
    my $code = pack("H*", "b80100000031dbcd80" . "b83c000000bf010000000f05");
    my $size = 120 + length $code;
    print pack("H*", "7f454c4602010100"), "\0" x 8, pack("S2 L Q3 L S6", 2, 62, 1, 0x400078, 64, 0, 0, 64, 56, 1, 0, 0, 0),
      pack("L2 Q6", 1, 5, 0, 0x400000, 0x400000, $size, $size, 0x1000), $code' >/opt/probe/other-calls
  chmod 755 /opt/probe/other-calls
  ip address add 192.0.2.7/32 dev lo
}

remove_probes() {
  ip address del 192.0.2.7/32 dev lo
  rm -rf /opt/probe /usr/lib/modules/probe /root/probe /tmp/probe
}

has_removed_ipc() { [ "$(ipcs -m | grep -c ' daemon ')" -eq 0 ]; }

expect_sandbox() {
  lCalls="SystemCallFilter=@system-service" lCallsLess="SystemCallFilter=~@privileged @resources"
  prepare_probes
  allows "AmbientCapabilities=CAP_NET_ADMIN" tavik 'ip address add 192.0.2.8/32 dev lo && ip address del 192.0.2.8/32 dev lo'
  forbids "CapabilityBoundingSet=CAP_NET_ADMIN" root 'chown daemon /opt/probe/file'
  forbids "NoNewPrivileges=yes" tavik 'test "$(/opt/probe/id -u)" = 0'
  forbids "ProtectSystem=strict" root 'touch /opt/probe/file'
  forbids "ProtectHome=yes" root 'test -e /root/probe'
  forbids "PrivateTmp=yes" root 'test -e /tmp/probe'
  forbids "PrivateDevices=yes" root 'test -e /dev/console'
  forbids "ProtectKernelModules=yes" root 'ls /usr/lib/modules/probe'
  on_machine forbids "ProtectKernelLogs=yes" root 'dmesg'
  on_machine forbids "ProtectClock=yes" root 'date --set="@$(date +%s)"'
  forbids "ProtectHostname=yes" root 'hostname "$(hostname)"'
  on_machine forbids "ProtectControlGroups=yes" root 'mkdir /sys/fs/cgroup/probe && rmdir /sys/fs/cgroup/probe'
  forbids "ProtectProc=invisible" tavik 'test -e /proc/1/comm'
  forbids "RestrictNamespaces=yes" root 'unshare --net true'
  forbids "RestrictRealtime=yes" root 'chrt --fifo 1 true'
  forbids "RestrictSUIDSGID=yes" root 'chmod 4755 /opt/probe/file'
  forbids "LockPersonality=yes" root 'setarch "$(uname -m)" --addr-no-randomize true'
  forbids "MemoryDenyWriteExecute=yes" root 'perl -e "exit(syscall(9, 0, 4096, 7, 0x22, -1, 0) == -1)"' # mmap
  forbids "RestrictAddressFamilies=AF_UNIX AF_NETLINK AF_INET AF_INET6" root 'perl -e "exit(!socket(my \$s, 17, 3, 0))"' # AF_PACKET
  on_machine forbids "IPAddressDeny=any" root 'echo probe >/dev/udp/192.0.2.7/9'
  on_machine allows "IPAddressAllow=localhost" root 'echo probe >/dev/udp/127.0.0.1/9' "IPAddressDeny=any"
  forbids "SystemCallArchitectures=native" root /opt/probe/other-calls
  forbids "SystemCallFilter=@system-service" root 'chroot / true'
  forbids "SystemCallFilter=~@privileged @resources" root 'renice -n 5 -p "$BASHPID"' "$lCalls"
  allows "SystemCallFilter=capset" tavik 'setpriv --inh-caps=-all true' "$lCalls" "$lCallsLess"
  # Without it the call ends the process.
  allows "SystemCallErrorNumber=EPERM" root 'perl -e "my (\$root) = qw(/); syscall(161, \$root); exit 0"' "$lCalls" # chroot
  # A key that another service of the same user has left. Without a mode of its own a service would see the user's keys.
  on_machine run_probe tavik 'perl -e "my (\$t, \$d) = qw(user probe); syscall(248, \$t, \$d, \$d, 5, -4)"' "KeyringMode=shared"  # add_key
  on_machine forbids "KeyringMode=private" tavik 'perl -e "my (\$t, \$d) = qw(user probe); exit(syscall(249, \$t, \$d, 0, 0) < 0)"' "KeyringMode=shared" # request_key
  # What the last service of a user leaves behind. Of the user tavik one runs.
  for lLine in "RemoveIPC=no" "RemoveIPC=yes"; do
    run_probe daemon 'ipcmk --shmem 4096' "$lLine"
    [ "$lLine" = "RemoveIPC=no" ] || wait_until 60 has_removed_ipc
    expect "$lLine: shared memory of a service that has ended is gone" "${lLine#*=}" "$(has_removed_ipc && echo yes || echo no)"
    ipcrm --all=shm
  done
  remove_probes
  expect "lines of the sandbox without a probe" "" "$(all_sandbox_lines | while read -r lLine; do
    grep -q -F -- "\"$lLine\"" "$1" || echo "$lLine"
  done)"
}
