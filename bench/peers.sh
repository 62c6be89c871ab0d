#!/usr/bin/env bash
# Runs vexg beside public tools that do the same work, in one go, and prints medians and ratios.
# Usage: bench/peers.sh [--size N] [--runs N] [--work FOLDER] [SECTION...]
#   sections: open read stats hist calibrate calc pyramid warp mosaic polygons zones segments segment-quality
#   attributes classes class-quality memory outputs python; all by default. Installs the peers if they are missing. Random windows
#   need a build with -DVEXG_BUILD_BENCH=ON.
set -euo pipefail
cd "$(dirname "${BASH_SOURCE[0]}")/.."
source scripts/setup.sh
install_packages
install_packages_of bench/peer_packages.txt
build release vexg_host vexg_plugins vexg_resources
exec /usr/bin/python3 bench/peers.py --vexg build/release/bin/vexg "$@"
