#!/usr/bin/env bash
# Set-up, build and run on a Debian machine. Installs missing Debian packages with apt-get first.
#
#   ./dev.sh demo                      build and run the demo on the emulated platform
#   ./dev.sh test [--werror] [--sanitize]
#                                      build and run every test (--sanitize: under ASan + UBSan)
#   ./dev.sh package                   build the Debian packages into build/dev/packages and check them
set -euo pipefail
cd "$(dirname "$0")"

packages=(cmake ninja-build g++ pkg-config libjsoncpp-dev libunistring-dev libgtest-dev libcli11-dev
          help2man dpkg-dev file)

install_missing_packages() {
    local missing=()
    for package in "${packages[@]}"; do
        dpkg-query -W -f='${Status}' "$package" 2>/dev/null | grep -q "install ok installed" || missing+=("$package")
    done
    [ ${#missing[@]} -eq 0 ] && return 0
    echo "Installing: ${missing[*]}"
    local sudo=""
    [ "$(id -u)" -ne 0 ] && sudo="sudo"
    $sudo apt-get update -qq
    DEBIAN_FRONTEND=noninteractive $sudo apt-get install -y -qq "${missing[@]}"
}

build() {
    local preset=$1
    shift
    cmake --preset "$preset" "$@" >/dev/null
    cmake --build --preset "$preset"
}

command=${1:-}
shift || true
case "$command" in
demo)
    install_missing_packages
    build dev
    ./build/dev/tools/fileindex-demo
    ;;
test)
    werror=OFF
    preset=dev
    for option in "$@"; do
        case "$option" in
        --werror) werror=ON ;;
        --sanitize) preset=asan ;;
        *) echo "unknown option: $option" >&2; exit 2 ;;
        esac
    done
    install_missing_packages
    build "$preset" -DFILEINDEX_WERROR="$werror"
    ctest --preset "$preset" -j "$(nproc)"
    ;;
package)
    install_missing_packages
    build dev
    rm -rf build/dev/packages
    cpack --config build/dev/CPackConfig.cmake
    packaging/check_packages.sh build/dev
    ;;
*)
    sed -n '2,8p' "$0" | sed 's/^# \{0,1\}//'
    exit 2
    ;;
esac
