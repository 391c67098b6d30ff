# Sourced by the public scripts: installs the Debian packages that are missing.
# Usage: install_packages PACKAGE...

install_packages() {
    local missing=() package
    for package in "$@"; do
        dpkg-query -W -f='${Status}' "$package" 2>/dev/null | grep -q 'ok installed' ||
            missing+=("$package")
    done
    [ ${#missing[@]} -eq 0 ] && return 0

    local as_root=()
    [ "$(id -u)" -eq 0 ] || as_root=(sudo)
    echo "Installing: ${missing[*]}" >&2
    "${as_root[@]}" apt-get update -qq >&2
    "${as_root[@]}" env DEBIAN_FRONTEND=noninteractive \
        apt-get install -y -qq --no-install-recommends "${missing[@]}" >&2
}

build_packages=(
    g++ cmake ninja-build pkg-config
    libpng-dev libjpeg62-turbo-dev rapidjson-dev libdraco-dev libxxhash-dev libpugixml-dev libgeos-dev
    libassimp-dev libstb-dev
    libgtest-dev libgmock-dev libbenchmark-dev
)
