#!/usr/bin/env bash
# Checks the Debian packages that cpack wrote for a build: every file `cmake --install` installs is
# in exactly one package, every library of this project that a packaged program or library loads
# comes from its own package or from one it depends on, and lintian, pedantic, finds no error and
# no warning in any package (the -dbgsym ones included), while every info or pedantic tag it still
# reports is listed with its reason in the README.
#
#   check_packages.sh BUILD_DIR      (the packages are BUILD_DIR/packages/*.deb and *.ddeb)
set -euo pipefail
build=$1
readme=$(dirname "$0")/../README.md
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

shopt -s nullglob
debs=("$build"/packages/*.deb)
if [ ${#debs[@]} -eq 0 ]; then
    echo "no packages in $build/packages"
    exit 1
fi

DESTDIR=$work/installed cmake --install "$build" --prefix /usr >/dev/null
(cd "$work/installed" && find . ! -type d | cut -c2- | sort) >"$work/installed.txt"

# "PATH PACKAGE" for every file of every package.
for deb in "${debs[@]}"; do
    package=$(dpkg-deb -f "$deb" Package)
    mkdir -p "$work/packages/$package"
    dpkg-deb -x "$deb" "$work/packages/$package"
    dpkg-deb -f "$deb" Depends | tr ',' '\n' | awk '{ print $1 }' >"$work/$package.depends"
    (cd "$work/packages/$package" && find . ! -type d | cut -c2- | sed "s/\$/ $package/")
done | sort >"$work/packaged.txt"

failed=0
report() {
    echo "$1"
    failed=1
}
for file in $(comm -23 "$work/installed.txt" <(cut -d' ' -f1 "$work/packaged.txt" | uniq)); do
    report "$file is installed but in no package"
done
for file in $(cut -d' ' -f1 "$work/packaged.txt" | uniq -d); do
    report "$file is in more than one package: $(grep "^$file " "$work/packaged.txt" | cut -d' ' -f2 | xargs)"
done

for directory in "$work"/packages/*; do
    package=$(basename "$directory")
    for needed in $(find "$directory" -type f -exec readelf -d {} + 2>/dev/null |
                    sed -n 's/.*(NEEDED).*\[\(.*\)\]/\1/p' | sort -u); do
        provider=$(awk -v name="$needed" '{ file = $1; sub(/.*\//, "", file) } file == name { print $2 }' \
                   "$work/packaged.txt")
        if [ -n "$provider" ] && [ "$provider" != "$package" ] && ! grep -qx "$provider" "$work/$package.depends"; then
            report "$package loads $needed from $provider but does not depend on it"
        fi
    done
done

# "SEVERITY: PACKAGE: TAG DETAILS" for every finding.
# Exit status 2: a finding of a severity in --fail-on; 1: lintian itself failed.
status=0
lintian --pedantic --display-info --fail-on error,warning "${debs[@]}" "$build"/packages/*.ddeb \
    >"$work/lintian.txt" 2>"$work/lintian.err" || status=$?
if [ $status -eq 2 ]; then
    grep -E '^[EW]: ' "$work/lintian.txt"
    report "lintian reports the errors and warnings above"
elif [ $status -ne 0 ]; then
    cat "$work/lintian.err"
    report "lintian failed (exit status $status)"
fi
for tag in $(sed -n 's/^[IP]: [^ ]* \([^ ]*\).*/\1/p' "$work/lintian.txt" | sort -u); do
    grep -q "| \`$tag\` |" "$readme" || report "lintian reports $tag, which the README's table of lintian tags does not list: $(grep -m1 " $tag" "$work/lintian.txt")"
done

if [ $failed -eq 0 ]; then
    echo "Packages checked: ${#debs[@]}, $(wc -l <"$work/packaged.txt") files, each in one package, with their dependencies;"
    echo "lintian: no error or warning, $(grep -c '^[IP]: ' "$work/lintian.txt") info and pedantic findings, each tag listed in the README."
fi
exit $failed
