# bash completion for fileindexctl: commands, their subcommands and options, and the indexed
# folders (asked of fileindexctl itself, on the root in force) where a command takes their paths.
_fileindexctl_indexed_paths() {
    fileindexctl --json folder list 2>/dev/null | grep -o '"path":"[^"]*"' | cut -d'"' -f4
}

_fileindexctl_shares() {
    _fileindexctl_indexed_paths | cut -d/ -f2 | sort -u
}

_fileindexctl() {
    local cur=${COMP_WORDS[COMP_CWORD]} prev=${COMP_WORDS[COMP_CWORD - 1]}
    local global="--root --json -q --quiet -v --verbose --lock-wait --help --version"
    local valued=" --root --lock-wait --offset --limit --sort --type --share --additional --name --request --hours --interval --samples --timeout "
    local command="" sub="" i word
    for ((i = 1; i < COMP_CWORD; i++)); do
        word=${COMP_WORDS[i]}
        if [[ $word == -* ]]; then
            [[ $valued == *" $word "* ]] && ((i++))
        elif [ -z "$command" ]; then
            command=$word
        elif [ -z "$sub" ]; then
            sub=$word
        fi
    done
    local words="" options=""
    case "$command" in
        "") words="status folder service share is reindex migrate explain search progress wait" ;;
        folder)
            case "$sub" in
                "") words="list get add set delete status" ;;
                list) options="--offset --limit --sort --desc --additional" ;;
                add) options="--name --document --no-document --audio --no-audio --video --no-video --photo --no-photo --request" ;;
                set)
                    options="--name --document --no-document --audio --no-audio --video --no-video --photo --no-photo --request"
                    words=$(_fileindexctl_indexed_paths)
                    ;;
                get | delete | status) words=$(_fileindexctl_indexed_paths) ;;
            esac
            ;;
        service)
            case "$sub" in
                "") words="status pause resume" ;;
                pause) options="--hours" ;;
            esac
            ;;
        share)
            case "$sub" in
                "") words="remove rename pause resume clean revive no-space need-reindex paths" ;;
                *) words=$(_fileindexctl_shares) ;;
            esac
            ;;
        is) [ -z "$sub" ] && words="share-indexed path-indexed full-path-indexed contains-indexed indexable skipped roomy" ;;
        reindex) words=$(_fileindexctl_indexed_paths) ;;
        explain)
            options="--rules"
            words=$(_fileindexctl_indexed_paths)
            ;;
        search)
            options="--type --share --limit --offset --sort --facets"
            case $prev in
                --sort) words="relevance date name" ;;
                --type) words="document audio video photo" ;;
            esac
            ;;
        progress) options="--watch --interval --samples" ;;
        wait) options="--timeout" ;;
    esac
    if [[ $cur == -* ]]; then
        mapfile -t COMPREPLY < <(compgen -W "$options $global" -- "$cur")
    else
        mapfile -t COMPREPLY < <(compgen -W "$words" -- "$cur")
    fi
}
complete -F _fileindexctl fileindexctl
