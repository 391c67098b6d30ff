#!/usr/bin/env bash
# Installs what is missing, builds everything and runs all tests.
# Arguments go to ctest, for instance: ./test.sh -R stream
set -euo pipefail
cd -- "$(dirname -- "${BASH_SOURCE[0]}")"
. cmake/install_dependencies.sh
install_packages "${build_packages[@]}"

cmake --preset release
cmake --build --preset release
ctest --preset release --parallel "$(nproc)" "$@"
