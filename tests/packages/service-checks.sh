# Checks of the service under systemd: sourced, after checks.sh.

properties() {
  lProperties=
  for lProperty in "$@"; do lProperties="$lProperties $(systemctl show -p "$lProperty" tavik)"; done
  echo "${lProperties# }"
}
has_restarted() { [ "$(properties NRestarts)" = NRestarts=1 ]; }

# drop_in NAME LINE: for [Service].
drop_in() {
  mkdir -p /etc/systemd/system/tavik.service.d
  printf '[Service]\n%s\n' "$2" >"/etc/systemd/system/tavik.service.d/$1.conf"
  systemctl daemon-reload
}
configure() { sed -i "$1" /etc/tavik/tavik.toml; }
said_lately() { journalctl -b -u tavik --since -1min | grep -q -F -- "$1"; }

has_journal_entry() { journalctl -b --no-pager "$1" | grep -q .; }

# all_sandbox_lines: KEY=VALUE of each line of the unit's sandbox. sandbox_lines: those that systemd shows as they stand there.
all_sandbox_lines() { sed -n '/^AmbientCapabilities=/,/^\[Install\]/{/^[A-Z]/p}' /lib/systemd/system/tavik.service; }
sandbox_lines() { all_sandbox_lines | sed '1,/^CapabilityBoundingSet=/d' | grep -v '^SystemCall\|^Restrict[AN][da]\|^IPAddress'; }

# packed_unit WHEN KEY: the value in the unit of the packages of /packages/WHEN.
packed_unit() { dpkg-deb --fsys-tarfile "/packages/$1"/tavik_*.deb | tar -xO ./lib/systemd/system/tavik.service | sed -n "s/^$2=//p"; }

keeper_pid() { systemctl show -p MainPID --value tavik; }
agent_pid() { cat /run/tavik/agent/qrv-tvk.pid; }
collector_pid() { pgrep -f /libexec/tavik/tavik-collector -P "$(keeper_pid)"; }
pids() { pgrep -u tavik; }
is_other_agent() { [ -s /run/tavik/agent/qrv-tvk.pid ] && [ "$(agent_pid)" != "$1" ]; }

# status_lines PID: the rights that the kernel has down for that process.
status_lines() { sed -n 's/^\(CapPrm\|CapEff\|CapAmb\|CapBnd\|NoNewPrivs\|Seccomp\|Uid\):[[:space:]]*\([0-9a-f]*\).*/\1=\2/p' "/proc/$1/status" | sort | tr '\n' ' '; }

# expect_rights: CAP_NET_ADMIN (bit 12) is effective in the agent alone, permitted in the keeper, which starts agents, and gone
# from the collector. All three are filtered, and gain nothing.
expect_rights() {
  lUser=$(id -u tavik)
  expect "rights of the keeper" \
    "CapAmb=0000000000000000 CapBnd=0000000000001000 CapEff=0000000000000000 CapPrm=0000000000001000 NoNewPrivs=1 Seccomp=2 Uid=$lUser " \
    "$(status_lines "$(keeper_pid)")"
  expect "rights of the agent" \
    "CapAmb=0000000000001000 CapBnd=0000000000001000 CapEff=0000000000001000 CapPrm=0000000000001000 NoNewPrivs=1 Seccomp=2 Uid=$lUser " \
    "$(status_lines "$(agent_pid)")"
  expect "rights of the collector" \
    "CapAmb=0000000000000000 CapBnd=0000000000001000 CapEff=0000000000000000 CapPrm=0000000000000000 NoNewPrivs=1 Seccomp=2 Uid=$lUser " \
    "$(status_lines "$(collector_pid)")"
}

# http_status ADDRESS PORT PATH: the first line of the answer.
http_status() {
  bash -c 'exec 3<>"/dev/tcp/$0/$1" && printf "GET %s HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\n\r\n" "$2" >&3 && head -n 1 <&3' \
    "$@" 2>&1 | tr -d '\r'
}
