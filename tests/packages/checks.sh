# Functions for scripts that test the packages in a tree, a container or a virtual machine: sourced. They print one line for each
# expectation: ok or FAIL, and what was checked. A failure also prints what was expected and what came. gBad is 1 after a failure.
gBad=0
gSensor= # the pid of a sensor that start_sensor started

step() { printf -- '-- %s\n' "$*"; }

# expect WHAT EXPECTED GOT
expect() {
  if [ "$2" = "$3" ]; then
    printf 'ok   %s\n' "$1"
  else
    printf 'FAIL %s: expected "%s", got "%s"\n' "$1" "$2" "$3"
    gBad=1
  fi
}

# expect_true WHAT COMMAND...
expect_true() {
  lWhat=$1
  shift
  if "$@" >/tmp/expect.out 2>&1; then
    printf 'ok   %s\n' "$lWhat"
  else
    printf 'FAIL %s: "%s" failed: %s\n' "$lWhat" "$*" "$(tail -n 3 /tmp/expect.out)"
    gBad=1
  fi
}

# wait_until SECONDS COMMAND...: until the command succeeds; fails when the time is over.
wait_until() {
  lEnd=$(($(date +%s) + $1 + 1))
  shift
  until "$@" 2>/dev/null; do
    [ "$(date +%s)" -lt $lEnd ] || return 1
    sleep 0.2
  done
}

# Also with losses of the last day, as after a kill.
is_collecting() { [ "$(tavik --json status | jq .exit)" -le 1 ]; }
# has_state STATE: the word for Tavik's state, as --json names it.
has_state() { [ "$(tavik --json status | jq -r .state)" = "$1" ]; }
# occurrences KIND: of the whole history.
occurrences() { tavik --json events --kind "$1" | jq '[.episodes[].count] | add // 0'; }
has_occurrences() { [ "$(occurrences "$1")" = "$2" ]; }
store_id() { tavik --json events --limit 1 | jq -r .storeId; }

# expect_occurrences WHAT KIND COUNT: within 90 seconds.
expect_occurrences() {
  wait_until 90 has_occurrences "$2" "$3"
  expect "$1" "$3" "$(occurrences "$2")"
}

# list_files: all that a package may leave behind; what apt, dpkg and the linker's cache write themselves is not listed.
list_files() {
  find / -xdev \( -path /proc -o -path /sys -o -path /dev -o -path /tmp -o -path /out -o -path /tests -o -path /packages \
    -o -path /var/lib/dpkg -o -path /var/lib/apt -o -path /var/cache -o -path /var/log/journal \) -prune -o \
    ! -path '/etc/passwd-' ! -path '/etc/group-' ! -path '/etc/shadow-' ! -path '/etc/gshadow-' ! -path '/etc/.pwd.lock' \
    ! -path '/var/log/dpkg.log' ! -path '/var/log/alternatives.log' ! -path '/var/lib/logrotate/*' ! -path '/run/systemd/*' \
    ! -path '/run/log/*' ! -path '/run/credentials*' -print | sort
}
