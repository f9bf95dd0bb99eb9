# Bash completion for fileindexctl. The tool itself answers ("fileindexctl __complete -- WORDS..."),
# so subcommands, options, their values, share names and folder paths are always those of the
# installed tool and of the appliance it runs on.
_fileindexctl() {
    local IFS=$'\n'
    COMPREPLY=($("${COMP_WORDS[0]}" __complete -- "${COMP_WORDS[@]:1:COMP_CWORD}" 2>/dev/null))
    # Quote what is inserted as bash would a file name; a directory ending in "/" takes no space.
    # (compopt fails outside a completion, as when a script calls the function.)
    compopt -o filenames 2>/dev/null || true
    if [[ ${#COMPREPLY[@]} -eq 1 && ${COMPREPLY[0]} == */ ]]; then
        compopt -o nospace 2>/dev/null || true
    fi
}
complete -F _fileindexctl fileindexctl
