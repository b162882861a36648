# bash completion for fileindexctl: commands, their subcommands and the global options.
_fileindexctl() {
    local cur=${COMP_WORDS[COMP_CWORD]}
    local before=" ${COMP_WORDS[*]:1:COMP_CWORD-1} "
    local options="--root --json -q --quiet --lock-wait --help --version"
    local words
    case "$before" in
        *" folder "*) words="list get add set delete status" ;;
        *" service "*) words="status pause resume" ;;
        *" share "*) words="remove rename pause resume clean revive no-space need-reindex paths" ;;
        *" is "*) words="share-indexed path-indexed full-path-indexed contains-indexed indexable skipped roomy" ;;
        *) words="folder service share is reindex migrate explain progress wait" ;;
    esac
    mapfile -t COMPREPLY < <(compgen -W "$words $options" -- "$cur")
}
complete -F _fileindexctl fileindexctl
