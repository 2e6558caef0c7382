# Completion of parvel(1) for bash.

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

_parvel() {
    local current=${COMP_WORDS[COMP_CWORD]} previous=${COMP_WORDS[COMP_CWORD - 1]}
    local command='' i
    for ((i = 1; i < COMP_CWORD; i++)); do
        case ${COMP_WORDS[i]} in
            --log) ((i++)) ;;
            -*) ;;
            *)
                command=${COMP_WORDS[i]}
                break
                ;;
        esac
    done

    COMPREPLY=()
    case $previous in
        --log)
            mapfile -t COMPREPLY < <(compgen -W 'off fault error default debug' -- "$current")
            return
            ;;
        --flavor)
            mapfile -t COMPREPLY < <(
                compgen -W 'full content-library store progress identity' -- "$current")
            return
            ;;
        --progress)
            mapfile -t COMPREPLY < <(compgen -W 'auto always never json' -- "$current")
            return
            ;;
        -j | --jobs | --set | --key | --size | --update | --display-name) return ;;
        cloud)
            mapfile -t COMPREPLY < <(compgen -W 'add take replace status' -- "$current")
            return
            ;;
    esac
    if [[ $current == -* ]]; then
        mapfile -t COMPREPLY < <(compgen -W "$(_parvel_options "$command")" -- "$current")
    elif [[ -z $command ]]; then
        mapfile -t COMPREPLY < <(compgen -W \
            'attributes check cloud cover doctor edit inflate inspect install match move
                pack redact remove rename trash update' -- "$current")
    else
        compopt -o filenames
        mapfile -t COMPREPLY < <(compgen -f -- "$current")
    fi
}

complete -F _parvel parvel
