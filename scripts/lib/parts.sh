# Shared by the checks that mostly wait, and therefore run in several parts at once: sourced behind common.sh, never run.

gPartPids=()

# end_parts: ends the parts that still run, each with all that it has started.
end_parts() {
  local lPid
  for lPid in "${gPartPids[@]}"; do kill -- "-$lPid" 2>/dev/null || true; done
  gPartPids=()
}

# run_parts COUNT FOLDER PATTERN COMMAND [ARGUMENT...]: runs COMMAND PART ARGUMENT... for the parts 0 to COUNT - 1, all at once, and
# waits for them. The output of a part goes to FOLDER/PART.log. Lines in which the extended regular expression PATTERN matches are
# shown as they come. If parts have failed, it shows the ends of their logs and returns 1. If the script ends, its parts end too.
run_parts() {
  local lCount=$1 lFolder=$2 lPattern=$3 lCommand=$4 lPart lFiles=() lFailed=() lWatched lShown
  shift 4
  [[ $lCount =~ ^[1-9][0-9]*$ ]] || fail "${0##*/}: the number of parts has to be above 0, not '$lCount'"
  rm -rf "$lFolder"
  mkdir -p "$lFolder"
  trap end_parts EXIT
  for ((lPart = 0; lPart < lCount; lPart++)); do
    lFiles+=("$lFolder/$lPart.log")
    : >"${lFiles[lPart]}" # it is there when the lines are shown
    set -m               # a process group of its own
    "$lCommand" "$lPart" "$@" >"${lFiles[lPart]}" 2>&1 &
    set +m
    gPartPids+=($!)
  done
  # The lines are shown for as long as this process lives, and all that is there when it ends.
  tail --pid=$$ -f /dev/null &
  lWatched=$!
  tail --pid=$lWatched -s 0.2 -q -n +1 -f "${lFiles[@]}" | grep --line-buffered -E "$lPattern" &
  lShown=$!
  for ((lPart = 0; lPart < lCount; lPart++)); do
    wait "${gPartPids[lPart]}" || lFailed+=("$lPart")
  done
  gPartPids=()
  trap - EXIT
  kill $lWatched
  wait $lWatched $lShown 2>/dev/null || true
  for lPart in "${lFailed[@]}"; do
    printf '\n== Part %d of %d failed. The end of %s:\n' "$lPart" "$lCount" "${lFiles[lPart]}" >&2
    tail -n 60 "${lFiles[lPart]}" >&2
  done
  [ ${#lFailed[@]} -eq 0 ]
}
