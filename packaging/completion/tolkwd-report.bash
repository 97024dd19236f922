# Completion of tolkwd-report(1) for bash, which loads it by the file's name.
# shellcheck shell=bash

# Of the usual log. Names may hold anything, and bash would expand what they hold: only plain ones.
_tolkwd_report_services() {
    tolkwd-report status --json 2>/dev/null | grep -aoE '"service": *"[A-Za-z0-9@._+-]+"' |
        cut -d '"' -f 4
}

# Offers what begins as the word under the cursor does: a command as the first word, a kind or a
# service behind the option that takes one, nothing behind one that takes a time, else the command's
# options, or folders and files.
_tolkwd_report() {
    local word=${COMP_WORDS[COMP_CWORD]} previous=${COMP_WORDS[COMP_CWORD - 1]} offers=
    # "--kind=KIND" comes as three words.
    if [[ $word == = ]]; then
        word=
    elif [[ $previous == = && $COMP_CWORD -ge 2 ]]; then
        previous=${COMP_WORDS[COMP_CWORD - 2]}
    fi
    COMPREPLY=()
    case $previous in
        --kind)
            offers='checked configuration daemon failed figures gave-up recovered recovery-tried
                skipped state step unknown unwatched watched'
            ;;
        --service) offers=$(_tolkwd_report_services) ;;
        --since | --until) return ;;
        *)
            if [[ $COMP_CWORD -eq 1 ]]; then
                offers='events html messages status --help --version'
            elif [[ $word == -* ]]; then
                case ${COMP_WORDS[1]} in
                    events) offers='--all --follow --help --json --kind --service --since --until' ;;
                    html) offers='--help --now -o' ;;
                    status) offers='--help --json --now' ;;
                    *) offers='--help' ;;
                esac
            elif [[ ${COMP_WORDS[1]} != messages ]]; then
                # A folder goes on behind its slash.
                compopt -o filenames 2>/dev/null
                mapfile -t COMPREPLY < <(compgen -f -- "$word")
                return
            fi
            ;;
    esac
    mapfile -t COMPREPLY < <(compgen -W "$offers" -- "$word")
}

complete -F _tolkwd_report tolkwd-report
