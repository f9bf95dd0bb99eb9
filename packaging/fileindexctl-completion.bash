# Bash completion for fileindexctl. Subcommands and options are read from the tool's own help at
# the moment of completing, so they are always those of the installed tool.
_fileindexctl() {
    local current=${COMP_WORDS[COMP_CWORD]}
    local words=() i help
    # The subcommand typed so far: its words, without options and their values.
    for ((i = 1; i < COMP_CWORD; i++)); do
        [[ ${COMP_WORDS[i]} == -* ]] || words+=("${COMP_WORDS[i]}")
    done
    help=$("${COMP_WORDS[0]}" "${words[@]}" --help 2>/dev/null) || return 0
    local section=Subcommands pattern='^  ([a-z][-a-z]*) '
    if [[ $current == -* ]]; then
        section=Options pattern='^  (-[-a-z,]*)'
    fi
    local candidates=() line in_section=0 name
    while IFS= read -r line; do
        if [[ $line == "$section:" ]]; then
            in_section=1
        elif [[ -z $line ]]; then
            in_section=0
        elif ((in_section)) && [[ $line =~ $pattern ]]; then
            for name in ${BASH_REMATCH[1]//,/ }; do
                candidates+=("$name")
            done
        fi
    done <<<"$help"
    COMPREPLY=($(compgen -W "${candidates[*]}" -- "$current"))
}
complete -F _fileindexctl fileindexctl
