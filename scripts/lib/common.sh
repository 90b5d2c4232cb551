# Shared by the scripts: sourced, never run. Sets the working directory to the root of the tree.

set -euo pipefail

gRoot=$(cd "$(dirname "${BASH_SOURCE[0]}")/../.." && pwd)
cd "$gRoot"

# What each step builds with, as Debian's package names.
gCompilerPackages=(g++ gcc cmake ninja-build ccache)
gClientPackages=(libcli11-dev nlohmann-json3-dev)
gSensorPackages=(libarchive-dev libsqlite3-dev libtomlplusplus-dev libmicrohttpd-dev prometheus-cpp-dev)
gTestPackages=(libgtest-dev libgmock-dev python3 python3-pyte)
gBenchPackages=(libbenchmark-dev prometheus-cpp-dev libspdlog-dev prometheus-node-exporter python3)
gClangPackages=(clang libclang-rt-14-dev llvm)
gCoveragePackages=(gcovr python3)
gStylePackages=(clang-format clang-tidy)
gPagePackages=(chromium chromium-driver python3 python3-selenium)
gPackagePackages=(dpkg-dev debhelper lintian fakeroot lowdown git systemd)
gVmPackages=(make qemu-system-x86 busybox-static kmod cpio xz-utils iproute2 jq sg3-utils)
gTreePackages=(debootstrap systemd-container dpkg-dev e2fsprogs git)
gFleetPackages=(prometheus prometheus-alertmanager prometheus-node-exporter rsyslog curl python3 python3-yaml python3-jsonschema)
gJournalPackages=(systemd util-linux)

# Presets and checks compile the same sources again and again, so ccache is used if it is installed. Paths are relative to the
# tree, so that another clone of it finds the same entries.
if command -v ccache >/dev/null; then
  export CMAKE_C_COMPILER_LAUNCHER=ccache CMAKE_CXX_COMPILER_LAUNCHER=ccache
  export CCACHE_BASEDIR=$gRoot CCACHE_NOHASHDIR=1 CCACHE_IGNOREOPTIONS='-fmacro-prefix-map=*'
fi

say() { printf '\n== %s\n' "$*"; }
fail() {
  printf '%s\n' "$*" >&2
  exit 1
}

# need_packages PACKAGE...: installs missing packages if the user is root. Otherwise prints the command for it and ends.
need_packages() {
  local lMissing=() lPackage
  for lPackage in "$@"; do
    if [ "$(dpkg-query -W -f '${db:Status-Status}' "$lPackage" 2>/dev/null)" != installed ]; then
      lMissing+=("$lPackage")
    fi
  done
  [ ${#lMissing[@]} -eq 0 ] && return 0
  if [ "$(id -u)" -ne 0 ]; then
    fail "Packages are missing. Install them with:
  sudo apt-get update && sudo apt-get install -y --no-install-recommends ${lMissing[*]}"
  fi
  say "Installing ${lMissing[*]}"
  export DEBIAN_FRONTEND=noninteractive
  apt-get update -q
  apt-get install -q -y --no-install-recommends "${lMissing[@]}"
}

# show_progress: passes a build's output on. On a terminal it shows only the latest of ninja's status lines, "[DONE/ALL] ...".
# Elsewhere it shows one every five seconds. All other lines, such as warnings and errors, are shown at once.
show_progress() {
  local lLine lStep lNext=0 lClear=
  [ -t 1 ] && lClear=$'\r\033[K'
  while IFS= read -r lLine; do
    case $lLine in
      '['[0-9]*/[0-9]*'] '*)
        lStep=${lLine%%]*}
        if [ -n "$lClear" ]; then
          printf '%s   step %s' "$lClear" "${lStep#[}"
        elif [ $SECONDS -ge $lNext ]; then
          printf '   step %s\n' "${lStep#[}"
          lNext=$((SECONDS + 5))
        fi
        ;;
      'ninja: no work to do.' | 'ninja: Entering directory '*) ;;
      *) printf '%s%s\n' "$lClear" "$lLine" ;;
    esac
  done
  printf '%s' "$lClear"
}

# build_directory DIRECTORY [TARGET...]: builds what is out of date there. Says beforehand how much that is, and shows the
# progress.
build_directory() {
  local lDirectory=$1 lSteps lMinutes
  shift
  # A copy: if ninja has to make its own build.ninja again, it counts only the steps for that.
  cp "$lDirectory/build.ninja" "$lDirectory/count.ninja"
  lSteps=$(ninja -C "$lDirectory" -f count.ninja -n "$@" 2>/dev/null | grep -c '^\[' || true)
  rm "$lDirectory/count.ninja"
  # Measured: a step takes about a second of one processor.
  lMinutes=$(((lSteps / $(nproc) + 59) / 60))
  case $lSteps in
    0) echo "   nothing to build" ;;
    [1-9] | [1-4][0-9]) echo "   $lSteps steps, less than a minute" ;;
    *) echo "   $lSteps steps, about $lMinutes min" ;;
  esac
  in_turn "$lDirectory" ninja -C "$lDirectory" "$@" | show_progress
}

# in_turn DIRECTORY COMMAND...: runs the command while no other script configures or builds in this directory.
in_turn() {
  local lLock=build/.${1//\//-}.lock
  shift
  mkdir -p build
  flock -o "$lLock" "$@"
}

# configure PRESET [DIRECTORY [CMAKE-OPTION...]]: into build/PRESET, or into the directory.
configure() {
  local lPreset=$1 lDirectory=${2:-build/$1}
  shift $(($# > 1 ? 2 : 1))
  in_turn "$lDirectory" cmake --preset "$lPreset" -B "$lDirectory" "$@" >/dev/null
}

# configure_and_build PRESET: into build/PRESET.
configure_and_build() {
  configure "$1"
  build_directory "build/$1"
}
