#!/usr/bin/env bash
# Runs vexg beside public tools that do the same work, in one go, and prints medians and ratios.
# Usage: bench/peers.sh [--size N] [--runs N] [--work FOLDER] [SECTION...]
#   sections: stats hist calibrate calc pyramid warp mosaic polygons zones segments segment-quality attributes memory; all by
#   default. Installs the peers if they are missing.
set -euo pipefail
cd "$(dirname "${BASH_SOURCE[0]}")/.."
source scripts/setup.sh
install_packages
install_packages_of bench/peer_packages.txt
build release vexg_host
exec /usr/bin/python3 bench/peers.py --vexg build/release/bin/vexg "$@"
