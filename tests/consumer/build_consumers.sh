#!/usr/bin/env bash
# Installs a build into a temporary prefix and uses it as a consumer would: the interface programs
# (tests/interface, one in C, one in C++) are built against the installed package with CMake and
# with pkg-config and run in the sandbox appliance under ROOT; the installed fileindexctl is reached
# through its bash completion, and its man page names every subcommand.
#
#   build_consumers.sh BUILD_DIR ROOT
set -euo pipefail
build=$1
root=$2
here=$(cd "$(dirname "$0")" && pwd)
interface=$here/../interface
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
prefix=$work/prefix

cmake --install "$build" --prefix "$prefix" >/dev/null
libdir=$(dirname "$(find "$prefix" -name libfileindex.so)")
export PKG_CONFIG_PATH=$libdir/pkgconfig

# Built exactly as the README says, with nothing but the prefix named: the linker finds the
# library's own libraries (the emulated platform) through what the package tells it.
unset LD_LIBRARY_PATH LIBRARY_PATH
cmake -S "$here/find_package" -B "$work/cmake" -G Ninja -DCMAKE_PREFIX_PATH="$prefix" >/dev/null
cmake --build "$work/cmake" >/dev/null
cc -o "$work/flat_client" "$interface/flat_client.c" $(pkg-config --cflags --libs fileindex)
c++ -std=c++17 -o "$work/class_client" "$interface/class_client.cpp" $(pkg-config --cflags --libs fileindex)

# Off the standard directories the loader is told where the libraries are, as the README says.
export LD_LIBRARY_PATH=$libdir
for program in cmake/flat_client cmake/class_client flat_client class_client; do
    cmake -DROOT="$root" -DPROGRAM="$work/$program" -P "$interface/run_in_appliance.cmake"
done
echo "The C and C++ programs built against the installed package with CMake and with pkg-config, and ran."

# Completing a command line runs the installed tool: "WORDS TYPED|A WORD OFFERED".
export PATH=$prefix/bin:$PATH
source "$prefix/share/bash-completion/completions/fileindexctl"
while IFS='|' read -r typed offered; do
    read -ra COMP_WORDS <<<"$typed"
    COMP_CWORD=$((${#COMP_WORDS[@]} - 1))
    _fileindexctl
    if [[ " ${COMPREPLY[*]} " != *" $offered "* ]]; then
        echo "completing '$typed' offers '${COMPREPLY[*]}', not $offered"
        exit 1
    fi
done <<'EOT'
fileindexctl fo|folder
fileindexctl folder g|get
fileindexctl status --j|--json
EOT

page=$(zcat "$prefix/share/man/man1/fileindexctl.1.gz")
for command in $(fileindexctl --help | sed -n '/^Subcommands:$/,/^$/s/^  \([a-z][-a-z]*\) .*/\1/p'); do
    if ! grep -qx ".SS \"$command\"" <<<"$page"; then
        echo "the man page does not describe '$command'"
        exit 1
    fi
done
echo "fileindexctl: installed, completed and described"
