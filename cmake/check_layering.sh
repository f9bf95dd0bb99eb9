#!/usr/bin/env bash
# Checks that the library's rooms (config/, share/, folder/, daemon/, status/, index_mgr/) use each
# other only along the edges listed in the "Edges between rooms" table of docs/architecture.md, and
# that every edge listed there is still used. Run by ctest as the test "layering".
#
#   check_layering.sh <architecture.md> <source dir> <file listing the library's object files>
#
# A room X uses a room Y when an object compiled from X/ refers to a symbol that an object compiled
# from Y/ defines (calls through the exported headers included), or when a file in X/ includes a
# header of Y/. Every room may use config/, the floor they all stand on, without a row.
set -euo pipefail

doc=$1
src=$2
objects_file=$3

# Objects lie at <target>.dir/<room>/<source>.o (or .dir/./<room>/...), as CMake lays them out.
mapfile -t objects <"$objects_file"

definitions=$(mktemp)
references=$(mktemp)
includes=$(mktemp)
trap 'rm -f "$definitions" "$references" "$includes"' EXIT

# "<file>:<nm line>" -> "<room> <source file> <type> <symbol>"
by_room='{ split($0, part, ":"); file = part[1]; sub(/.*\.dir\/(\.\/)?/, "", file); sub(/\.o$/, "", file)
           room = file; sub(/\/.*/, "", room); print room, file, $(NF - 1), $NF }'
# Strong definitions only: inline functions and template code are defined (weakly) everywhere.
nm -A -g --defined-only "${objects[@]}" | awk "$by_room" | awk '$3 ~ /^[TDBRGS]$/ { print $4, $1 }' >"$definitions"
nm -A -u "${objects[@]}" | awk "$by_room" | awk '{ print $1, $4, $2 }' >"$references"
mapfile -t rooms < <(awk '{ print $2 }' "$definitions" | sort -u)

room_pattern=$(IFS='|'; echo "${rooms[*]}")
for room in "${rooms[@]}"; do
    grep -HnoE "#include \"($room_pattern)/[^\"]+\"" "$src/$room"/*.cpp "$src/$room"/*.h 2>/dev/null |
        sed -E "s|^$src/||; s|^([^:]+:[0-9]+):#include \"([^/]+)/([^\"]+)\"|$room \\2 \\1 includes \\2/\\3|" \
            >>"$includes" || true
done

# Code edges: "from to evidence", one line per edge (the first piece of evidence found).
edges=$(
    {
        awk 'NR == FNR { room[$1] = $2; next }
             ($2 in room) && room[$2] != $1 { print $1, room[$2], $3, "uses", $2 }' "$definitions" "$references"
        awk '$1 != $2' "$includes"
    } | awk '$2 != "config" && !seen[$1 " " $2]++' |
        while read -r from to file how what; do
            [ "$how" = uses ] && what=$(c++filt "$what" | sed 's/(.*//')
            echo "$from $to $file $how $what"
        done
)

# Allowed edges: the rows "| `from/` | `to/` | why |" of the table under "## Edges between rooms".
allowed=$(awk '/^## / { inside = ($0 ~ /^## Edges between rooms/) }
               inside && /^\| *`[a-z_]+\/` *\| *`[a-z_]+\/` *\|/ {
                   split($0, cell, "|"); from = cell[2]; to = cell[3]; why = cell[4]
                   gsub(/[ `\/]/, "", from); gsub(/[ `\/]/, "", to); gsub(/^ +| +$/, "", why)
                   print from, to, (why == "" ? "-" : "+")
               }' "$doc")

status=0
while read -r from to evidence; do
    [ -n "$from" ] || continue
    if ! grep -q "^$from $to [+-]$" <<<"$allowed"; then
        echo "not allowed: $from/ -> $to/ ($evidence)"
        status=1
    fi
done <<<"$edges"
while read -r from to why; do
    [ -n "$from" ] || continue
    if [ "$why" = "-" ]; then
        echo "no reason given: the row $from/ -> $to/ of docs/architecture.md needs its why"
        status=1
    fi
    if ! grep -q "^$from $to " <<<"$edges"; then
        echo "not used: $from/ -> $to/ is listed in docs/architecture.md, but no code of $from/ uses $to/"
        status=1
    fi
done <<<"$allowed"

if [ "$status" -ne 0 ]; then
    echo
    echo "A room may use another only along a row of the table \"Edges between rooms\" in docs/architecture.md."
    echo "Either keep the code within the allowed edges, or add a row | \`from/\` | \`to/\` | why | and its reason,"
    echo "and remove the rows of edges the code no longer has."
else
    echo "layering: $(grep -c . <<<"$edges") edges between rooms, all listed in docs/architecture.md"
fi
exit "$status"
