# For the scripts of this project; sourced, with `root` set to the project's folder.

say() { printf '%s\n' "$*" >&2; }

# install_packages PACKAGE...: installs what is missing, on Debian and its kin, after saying so.
install_packages() {
  if ! command -v dpkg-query >/dev/null 2>&1 || ! command -v apt-get >/dev/null 2>&1; then
    say "This is no Debian system: if the build fails, install what these Debian packages hold: $*"
    return 0
  fi
  local missing=() package
  for package in "$@"; do
    [ "$(dpkg-query -W -f='${db:Status-Status}' "$package" 2>/dev/null)" = installed ] || missing+=("$package")
  done
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
    say "The packages could not be installed; the lines above say why."
    return 1
  fi
  rm -f "$log"
}

# build DIRECTORY TARGETS CMAKE_OPTION...: configures once and builds what has changed; prints only what went wrong.
build() {
  local directory=$1 targets=$2
  shift 2
  local log
  log=$(mktemp)
  if [ ! -f "$directory/build.ninja" ]; then
    say "Building in ${directory#"$root"/} (once; this takes some minutes)"
    mkdir -p "$directory"
    if ! cmake -S "$root" -B "$directory" -G Ninja "$@" >"$log" 2>&1; then
      cat "$log" >&2
      rm -f "$log" "$directory/build.ninja"
      return 1
    fi
  fi
  # shellcheck disable=SC2086  # several targets are several words
  if ! cmake --build "$directory" --target $targets >"$log" 2>&1; then
    cat "$log" >&2
    rm -f "$log"
    return 1
  fi
  rm -f "$log"
}
