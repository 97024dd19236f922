# Completion of tolkwd-check(8) for bash, which loads it by the file's name.
# shellcheck shell=bash

# The rules are asked of the program, whatever version it is; the PATH of ordinary users does not
# lead to it.
_tolkwd_check_rules() {
    PATH=$PATH:/usr/sbin tolkwd-check --rules 2>/dev/null | while read -r name _; do
        printf '%s\n' "$name"
    done
}

# Offers what begins as the word under the cursor does: a rule behind an option that takes one,
# nothing behind one that takes a number, else options, or folders and files named *.xml.
_tolkwd_check() {
    local word=${COMP_WORDS[COMP_CWORD]} previous=${COMP_WORDS[COMP_CWORD - 1]} pattern='!*.xml'
    # "--allow=RULE" comes as three words.
    if [[ $word == = ]]; then
        word=
    elif [[ $previous == = && $COMP_CWORD -ge 2 ]]; then
        previous=${COMP_WORDS[COMP_CWORD - 2]}
    fi
    COMPREPLY=()
    case $previous in
        --allow | --explain)
            mapfile -t COMPREPLY < <(compgen -W "$(_tolkwd_check_rules)" -- "$word")
            return
            ;;
        -t) return ;;
    esac
    if [[ $word == -* ]]; then
        mapfile -t COMPREPLY < <(compgen -W '--allow --explain --help --json --plan --probe --rules
            --version --yes -t' -- "$word")
        return
    fi
    # A folder goes on behind its slash.
    compopt -o filenames 2>/dev/null
    mapfile -t COMPREPLY < <(compgen -d -- "$word"; compgen -f -X "$pattern" -- "$word")
}

complete -F _tolkwd_check tolkwd-check
