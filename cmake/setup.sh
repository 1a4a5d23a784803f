# Functions for the scripts of this project. Source it with `root` set to the project's directory.

say() { printf '%s\n' "$*" >&2; }

# Build directories are below build/ in the checkout, or below QUAZOR_BUILD_DIR if it is set.
build_root=${QUAZOR_BUILD_DIR:-$root/build}

# Debian's packages of what the program is built with and uses.
program_packages=(g++ cmake ninja-build libcli11-dev libsqlite3-dev nlohmann-json3-dev libjs-dygraphs)

# install_packages PACKAGE...: installs missing packages on Debian and derivatives, after printing their names.
install_packages() {
  if ! command -v dpkg-query >/dev/null 2>&1 || ! command -v apt-get >/dev/null 2>&1; then
    say "This is not a Debian system: if the build fails, install the equivalents of these Debian packages: $*"
    return 0
  fi
  local missing lock
  find_missing "$@"
  [ ${#missing[@]} -gt 0 ] || return 0
  exec {lock}<"$root/cmake/setup.sh"
  flock "$lock"  # apt-get refuses to run twice at once
  find_missing "$@"
  install_missing || return 1
  exec {lock}>&-
}

# find_missing PACKAGE...: sets `missing` to those that are not installed.
find_missing() {
  local package
  missing=()
  for package in "$@"; do
    [ "$(dpkg-query -W -f='${db:Status-Status}' "$package" 2>/dev/null)" = installed ] || missing+=("$package")
  done
}

# install_missing: installs `missing`, which another run of a script may have done meanwhile.
install_missing() {
  [ ${#missing[@]} -gt 0 ] || return 0
  say "Installing with apt-get: ${missing[*]}"
  local sudo=()
  if [ "$(id -u)" -ne 0 ]; then
    command -v sudo >/dev/null 2>&1 || { say "This needs root: run it as root, or install sudo."; return 1; }
    sudo=(sudo)
  fi
  local log
  log=$(mktemp)
  if ! { "${sudo[@]}" apt-get update -qq &&
         "${sudo[@]}" env DEBIAN_FRONTEND=noninteractive apt-get install -y -qq --no-install-recommends "${missing[@]}"; } \
       >"$log" 2>&1; then
    cat "$log" >&2
    rm -f "$log"
    say "The packages could not be installed; see the messages above."
    return 1
  fi
  rm -f "$log"
}

# check_cmake: fails with a clear message if CMake is missing or too old.
check_cmake() {
  local needed=3.25 found
  found=$(cmake --version 2>/dev/null | sed -n '1s/.*version \([0-9.]*\).*/\1/p') || true
  if [ -z "$found" ]; then
    say "CMake is not installed. Install CMake $needed or newer; Debian 12 has it in the package cmake."
    return 1
  fi
  if [ "$(printf '%s\n' "$needed" "$found" | sort -V | head -n 1)" != "$needed" ]; then
    say "CMake $needed or newer is needed, and $(command -v cmake) is $found. Install a newer one; Debian 12 has it."
    return 1
  fi
}

# claim_build_folder DIRECTORY: creates a build directory, or prints why it cannot and what to do.
claim_build_folder() {
  local directory=$1 elsewhere="To build elsewhere: QUAZOR_BUILD_DIR=/some/directory $0"
  if ! mkdir -p "$directory" 2>/dev/null; then
    say "The directory $directory cannot be created: the checkout is read-only or belongs to another user. $elsewhere"
    return 1
  fi
  if [ ! -w "$directory" ] || { [ -e "$directory/build.ninja" ] && [ ! -w "$directory/build.ninja" ]; }; then
    say "The build in $directory belongs to $(stat -c %U "$directory") and is not writable. $elsewhere"
    return 1
  fi
  # CMake rejects a build directory that was configured for another source directory, for example after a move.
  local configured_for
  configured_for=$(sed -n 's/^CMAKE_HOME_DIRECTORY:INTERNAL=//p' "$directory/CMakeCache.txt" 2>/dev/null) || true
  if [ -n "$configured_for" ] && [ "$configured_for" != "$root" ]; then
    say "The build in $directory was configured for $configured_for; it is rebuilt for $root."
    find "$directory" -mindepth 1 -delete
  fi
}

# show_progress LOG: copies the output of ninja to the log and shows the number of completed steps: in one line of a
# terminal, otherwise in a line every 15 s. Prints nothing for a build that takes less than a second.
show_progress() {
  local line shown=0 told=$SECONDS begin=$SECONDS
  while IFS= read -r line; do
    printf '%s\n' "$line" >>"$1"
    [[ $line =~ ^\[([0-9]+)/([0-9]+)\] ]] || continue
    if [ -t 2 ]; then
      if [ $SECONDS -gt $begin ]; then
        printf '\rBuilding: %d of %d steps\033[K' "${BASH_REMATCH[1]}" "${BASH_REMATCH[2]}" >&2
        shown=1
      fi
    elif [ $((SECONDS - told)) -ge 15 ]; then
      say "Building: ${BASH_REMATCH[1]} of ${BASH_REMATCH[2]} steps after $((SECONDS - begin)) s"
      told=$SECONDS
    fi
  done
  [ $shown -eq 0 ] || printf '\r\033[K' >&2
}

# build DIRECTORY TARGETS CMAKE_OPTION...: configures once and builds, with progress; prints the output of the build
# only if it fails.
build() {
  local mask status=0
  mask=$(umask)
  umask g-w,o-w  # plug-ins that others may change are refused
  build_unshared "$@" || status=$?
  umask "$mask"
  return $status
}

build_unshared() {
  local directory=$1 targets=$2
  shift 2
  check_cmake || return 1
  claim_build_folder "$directory" || return 1
  local log lock
  exec {lock}>"$directory/.building"
  if ! flock --nonblock "$lock"; then
    say "Another build is running in $directory; waiting for it."
    flock "$lock"
  fi
  log=$(mktemp)
  if [ ! -f "$directory/build.ninja" ]; then
    say "Building in ${directory#"$root"/} (first build; this takes some minutes)"
    if ! cmake -S "$root" -B "$directory" -G Ninja "$@" >"$log" 2>&1; then
      cat "$log" >&2
      rm -f "$log" "$directory/build.ninja"
      return 1
    fi
  fi
  # shellcheck disable=SC2086  # several targets are several words
  if ! (set -o pipefail; cmake --build "$directory" --target $targets 2>&1 | show_progress "$log"); then
    cat "$log" >&2
    rm -f "$log"
    return 1
  fi
  rm -f "$log"
  exec {lock}>&-
}
