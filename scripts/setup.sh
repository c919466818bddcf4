# Sourced by the other scripts: installs what the build needs when it is missing, then
# configures and builds into build/ (or build-sanitize/ with QMX_SANITIZE=ON).
set -euo pipefail

QMX_ROOT=$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)
QMX_PACKAGES=(cmake ninja-build g++ pkg-config libboost-regex-dev libboost-dev libzstd-dev
              libsqlite3-dev libgtest-dev libgmock-dev libbenchmark-dev)

qmx_install_missing() {
    local missing=()
    for package in "${QMX_PACKAGES[@]}"; do
        dpkg-query -W -f='${Status}' "$package" 2>/dev/null | grep -q "install ok installed" ||
            missing+=("$package")
    done
    [ ${#missing[@]} -eq 0 ] && return 0
    echo "Installing: ${missing[*]}"
    local sudo=""
    [ "$(id -u)" -ne 0 ] && sudo="sudo"
    $sudo apt-get update -qq
    DEBIAN_FRONTEND=noninteractive $sudo apt-get install -y -qq "${missing[@]}"
}

# qmx_build DIR [cmake options...]
qmx_build() {
    local dir=$1
    shift
    qmx_install_missing
    cmake -S "$QMX_ROOT" -B "$QMX_ROOT/$dir" -G Ninja "$@" >/dev/null
    cmake --build "$QMX_ROOT/$dir"
}
