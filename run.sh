#!/usr/bin/env bash
# Installs what is missing, builds the exporter and runs it:
#   ./run.sh [options] INPUT OUTPUT     see README.md for the options
#   ./run.sh                            exports the bundled example into out/
set -euo pipefail
root="$(cd -- "$(dirname -- "${BASH_SOURCE[0]}")" && pwd)"
. "$root/cmake/install_dependencies.sh"
install_packages "${build_packages[@]}"

# The program's own lines are all that may reach the standard output.
(cd "$root" && cmake --preset release && cmake --build --preset release --target product) >&2

if [ $# -eq 0 ]; then
    mkdir -p "$root/out"
    set -- "$root/examples/lighthouse.dae" "$root/out/lighthouse.glb"
fi
exec "$root/build/release/bin/scene_export" "$@"
