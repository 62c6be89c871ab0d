# Installs the packages of a list that are missing, as root or through sudo. Sourced by ./demo,
# ./test and bench/peers.sh.

missing_packages() {
  local package
  grep -v '^#' "$1" | while read -r package; do
    dpkg-query -W -f '${Status}' "$package" 2>/dev/null | grep -q 'ok installed' || echo "$package"
  done
}

install_packages() {
  install_packages_of scripts/packages.txt
}

install_packages_of() {
  local missing run=()
  missing=$(missing_packages "$1" | tr '\n' ' ')
  [[ -z $missing ]] && return
  if ((EUID != 0)); then
    if ! command -v sudo >/dev/null; then
      echo "These packages are missing, and installing them takes root: $missing" >&2
      return 1
    fi
    run=(sudo)
  fi
  echo "Installing packages: $missing"
  "${run[@]}" apt-get update -qq
  # shellcheck disable=SC2086  # the list is words
  "${run[@]}" env DEBIAN_FRONTEND=noninteractive apt-get install -y -qq --no-install-recommends \
    $missing >/dev/null
}

# Configures one preset and builds the targets named behind it, or all; a second call does only what
# has changed.
build() {
  local preset=$1
  shift
  echo "Building ($preset)"
  [[ -f build/$preset/build.ninja ]] || cmake --preset "$preset" >/dev/null
  cmake --build --preset "$preset" ${1:+--target "$@"}
}

# Runs a command and says how long it took.
timed() {
  local name=$1 begin=$SECONDS
  shift
  "$@"
  printf '%s: %d min %02d s\n' "$name" $(((SECONDS - begin) / 60)) $(((SECONDS - begin) % 60))
}
