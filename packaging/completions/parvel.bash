# Completion of parvel(1) for bash.

# The options of a command; those before it for none.
_parvel_options() {
    case $1 in
        '') echo '--log --version --json --help -h' ;;
        attributes)
            echo '--write --update --dump --apply --dry-run --record --files-from --null -0 --recursive -r --jobs -j
                --json --jsonl --plist --log --help -h'
            ;;
        check)
            echo '--records --exit-code --dry-run --files-from --null -0
                --json --jsonl --plist --log --help -h'
            ;;
        cloud)
            echo '--into --replace --force --record --dry-run --files-from --null -0 --recursive -r
                --json --jsonl --plist --log --help -h'
            ;;
        cover) echo '--output -o --size --best --json --jsonl --plist --log --help -h' ;;
        doctor)
            echo '--exit-code --files-from --null -0
                --json --jsonl --plist --log --help -h'
            ;;
        edit)
            echo '--set --updates --cover --restore-cover --inflate --temporary --direct --progress --force --record --dry-run
                --files-from --null -0 --recursive -r
                --json --jsonl --plist --log --help -h'
            ;;
        inflate)
            echo '--temporary --direct --progress --force --record --dry-run
                --files-from --null -0 --recursive -r
                --json --jsonl --plist --log --help -h'
            ;;
        inspect)
            echo '--cover --extra --flavor --immediate --store --files-from --null -0 --recursive -r --jobs -j
                --json --jsonl --plist --log --help -h'
            ;;
        install)
            echo '--into --move --replace --rename --asset-id-name --cloud --updating --temporary --direct --progress --force --record --dry-run
                --files-from --null -0 --recursive -r
                --json --jsonl --plist --log --help -h'
            ;;
        match) echo '--key --json --jsonl --plist --log --help -h' ;;
        move)
            echo '--to --into --replace --rename --asset-id-name --force --record --dry-run --files-from --null -0 --recursive -r
                --json --jsonl --plist --log --help -h'
            ;;
        pack)
            echo '--output -o --progress --record --dry-run --files-from --null -0 --recursive -r
                --json --jsonl --plist --log --help -h'
            ;;
        redact)
            echo '--into --record --dry-run --files-from --null -0 --recursive -r
                --json --jsonl --plist --log --help -h'
            ;;
        remove)
            echo '--force --record --dry-run --files-from --null -0 --recursive -r
                --json --jsonl --plist --log --help -h'
            ;;
        rename)
            echo '--display-name --record --dry-run --files-from --null -0 --recursive -r
                --json --jsonl --plist --log --help -h'
            ;;
        trash)
            echo '--list --restore --record --dry-run --files-from --null -0 --recursive -r
                --json --jsonl --plist --log --help -h'
            ;;
        update)
            echo '--into --existing --progress --force --record --dry-run
                --files-from --null -0 --recursive -r
                --json --jsonl --plist --log --help -h'
            ;;
    esac
}

# What stands behind an option of a command: "file", "folder", "text" or the words it may be. Nothing
# for an option that has no value.
_parvel_value() {
    case "$1 $2" in
        *' --log') echo 'off fault error default debug' ;;
        *' --flavor') echo 'full content-library store progress identity' ;;
        *' --progress') echo 'auto always never json' ;;
        *' --into' | *' --temporary') echo folder ;;
        'edit --cover' | *' --apply' | *' --dump' | *' --existing' | *' --extra' | *' --files-from' | \
            *' --output' | *' -o' | *' --record' | *' --records' | *' --to' | *' --updates' | \
            *' --updating') echo file ;;
        *' --display-name' | *' --jobs' | *' -j' | *' --key' | *' --set' | *' --size' | \
            *' --update') echo text ;;
    esac
}

# What an operand of a command is, by how many stand before it.
_parvel_operand() {
    case "$1 $2" in
        ' 0') echo 'attributes check cloud cover doctor edit inflate inspect install match move
            pack redact remove rename trash update' ;;
        'cloud 0') echo 'add take replace status' ;;
        'pack 0') echo folder ;;
        'cover '[1-9]* | 'pack '[1-9]* | 'match '[2-9]*) echo text ;;
        *) echo file ;;
    esac
}

_parvel_offer() {
    case $1 in
        file) compopt -o default ;;
        folder) compopt -o dirnames ;;
        text) ;;
        *) mapfile -t COMPREPLY < <(compgen -W "$1" -- "$2") ;;
    esac
}

_parvel() {
    COMPREPLY=()
    # A word that holds a "=" is split there; here it is whole.
    local words=() i
    for ((i = 1; i <= COMP_CWORD; i++)); do
        if ((i > 1)) && [[ ${COMP_WORDS[i]} == = || ${COMP_WORDS[i - 1]} == = ]]; then
            words[-1]+=${COMP_WORDS[i]}
        else
            words+=("${COMP_WORDS[i]}")
        fi
    done
    local current=${words[-1]}
    unset 'words[-1]'

    local command='' operands=0 value='' options=yes word
    for word in "${words[@]}"; do
        if [[ -n $value ]]; then
            value=''
        elif [[ $word == -- ]]; then
            options=''
        elif [[ -n $options && $word == -* ]]; then
            value=$(_parvel_value "$command" "$word")
        elif [[ -z $command ]]; then
            command=$word
        else
            ((operands++))
        fi
    done

    if [[ -n $value ]]; then
        _parvel_offer "$value" "$current"
    elif [[ -z $options || $current != -* ]]; then
        _parvel_offer "$(_parvel_operand "$command" "$operands")" "$current"
    elif [[ $current == --*=* ]]; then
        _parvel_offer "$(_parvel_value "$command" "${current%%=*}")" "${current#*=}"
    else
        _parvel_offer "$(_parvel_options "$command")" "$current"
    fi
}

complete -F _parvel parvel
