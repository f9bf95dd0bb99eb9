#!/usr/bin/env bash
# Set-up, build and run on a Debian machine. Installs missing Debian packages with apt-get first.
#
#   ./dev.sh demo                      build and run the demo on the emulated platform
#   ./dev.sh test [--werror] [--sanitize]
#                                      build and run every test (--sanitize: under ASan + UBSan)
#   ./dev.sh package                   build the Debian packages into build/package/packages and
#                                      check them, lintian included
#   ./dev.sh fuzz [--werror]           build the fuzz targets with clang and run each on a fixed
#                                      number of inputs from its seeds in fuzz/corpus
#   ./dev.sh bench [repetitions]       optimised build, run the benchmarks, print the table of
#                                      docs/performance.md
set -euo pipefail
cd "$(dirname "$0")"

packages=(cmake ninja-build g++ pkg-config libjsoncpp-dev libunistring-dev libgtest-dev libcli11-dev
          help2man dpkg-dev file libbenchmark-dev jq lintian abigail-tools libcpp-httplib-dev
          chromium chromium-driver python3-selenium
          groff-base bsdextrautils)  # the last two render the man pages for their test
# Added for the fuzz targets: clang and its fuzzer and sanitizer runtimes.
fuzz_packages=(clang libclang-rt-dev)

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

# Each fuzz target and the number of inputs it tries: a few seconds apiece on two cores. The seed
# is fixed, so that a run is repeatable.
fuzz_targets=(command_frame:50000 queue_record:50000 status_conf:20000 folder_conf:20000)

run_fuzzers() {
    mkdir -p build/fuzz/artifacts
    for entry in "${fuzz_targets[@]}"; do
        local target=${entry%%:*} runs=${entry#*:}
        # New inputs go to the build tree's corpus; the committed seeds are only read.
        mkdir -p "build/fuzz/corpus/$target"
        echo "Fuzzing $target: $runs inputs"
        if ! "build/fuzz/fuzz/${target}_fuzzer" -runs="$runs" -seed=1 \
                -artifact_prefix="build/fuzz/artifacts/$target-" "build/fuzz/corpus/$target" "fuzz/corpus/$target" \
                >"build/fuzz/$target.log" 2>&1; then
            tail -n 40 "build/fuzz/$target.log"
            echo "$target failed; the input is in build/fuzz/artifacts. Once fixed, keep it in fuzz/corpus/$target." >&2
            return 1
        fi
        grep -E "^Done" "build/fuzz/$target.log"
    done
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
    # A build of its own, so that its sandbox (build/demo/root) stays for exploring whatever the
    # tests, which rebuild build/dev/root, do meanwhile.
    build demo
    ./build/demo/tools/fileindex-demo
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
    build package
    rm -rf build/package/packages
    cpack --config build/package/CPackConfig.cmake
    packaging/check_packages.sh build/package
    ;;
fuzz)
    werror=OFF
    for option in "$@"; do
        case "$option" in
        --werror) werror=ON ;;
        *) echo "unknown option: $option" >&2; exit 2 ;;
        esac
    done
    packages+=("${fuzz_packages[@]}")
    install_missing_packages
    build fuzz -DFILEINDEX_WERROR="$werror"
    run_fuzzers
    ;;
bench)
    install_missing_packages
    bench/run.sh "$@"
    ;;
*)
    sed -n '2,12p' "$0" | sed 's/^# \{0,1\}//'
    exit 2
    ;;
esac
