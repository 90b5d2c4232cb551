# Shared by the checks that let real engines read real sensors: sourced behind common.sh, never run.

gBin=$gRoot/build/release/bin
gDir=$(mktemp -d)
gStarted=()

# clean_up: ends what was started, the last first, and shows the ends of the logs where the check has failed.
clean_up() {
  local lStatus=$? lPid
  for lPid in "${gStarted[@]}"; do kill "$lPid" 2>/dev/null || true; done
  for lPid in "${gStarted[@]}"; do wait "$lPid" 2>/dev/null || true; done
  [ $lStatus -eq 0 ] || tail -n 5 "$gDir"/*.log >&2 || true
  rm -rf "$gDir"
}
trap clean_up EXIT
trap 'exit 130' INT TERM

# wait_until SECONDS WHAT COMMAND...
wait_until() {
  local lEnd=$((SECONDS + $1)) lSeconds=$1 lWhat=$2
  shift 2
  until "$@"; do
    [ $SECONDS -lt $lEnd ] || fail "${0##*/}: waited $lSeconds s for $lWhat"
    sleep 0.5
  done
}

# free_ports NUMBER: ports of the loopback that nobody uses now, one a line.
free_ports() {
  python3 - "$1" <<'PYTHON'
import socket, sys
lSockets = [socket.create_server(("127.0.0.1", 0)) for _ in range(int(sys.argv[1]))]
print(*[lSocket.getsockname()[1] for lSocket in lSockets], sep="\n")
PYTHON
}

# configure_sensor NAME LISTEN [TOML]: writes its configuration.
configure_sensor() {
  mkdir -p "$gDir/$1/run" "$gDir/$1/state"
  cat >"$gDir/$1/tavik.toml" <<TOML
[agent]
library = "$gRoot/build/release/lib/libkpm-sim.so"
log = "$gDir/$1/agent.log"
[sensor]
directory = "$gDir/$1/run"
state = "$gDir/$1/state"
[collect]
period = 1
[http]
listen = "$2"
${3:-}
TOML
}

# start_sensor NAME: its process is the last of gStarted.
start_sensor() {
  [ -x "$gBin/tavik-sensor" ] || fail "${0##*/}: $gBin/tavik-sensor is missing: run scripts/test first"
  KPM_SIM_SCENARIO=$gRoot/libkpm/sim/scenarios/demo.kpm KPM_SIM_SOCKET=$gDir/$1/sim.sock TAVIK_CONFIG=$gDir/$1/tavik.toml \
    "$gBin/tavik-sensor" >>"$gDir/sensor-$1.log" 2>&1 &
  gStarted+=($!)
}

# ask_sensor NAME ARGUMENT...: what tavik prints of it.
ask_sensor() { TAVIK_CONFIG=$gDir/$1/tavik.toml "$gBin/tavik" "${@:2}" 2>/dev/null; }
# inject NAME EVENT
inject() { KPM_SIM_SOCKET=$gDir/$1/sim.sock "$gBin/kpm-sim" inject "$2" >/dev/null; }
# has_demo NAME: each of the twenty kinds has come.
has_demo() { [ "$(ask_sensor "$1" --json events | grep -o '"kind": *"[^"]*"' | sort -u | wc -l)" -eq 20 ]; }
