# bash completion for marrowdale(1)

_marrowdale_options() {
    case $1 in
    page) printf '%s\n' --page ;;
    changes) printf '%s\n' --since --all ;;
    import) printf '%s\n' --into ;;
    mkdir) printf '%s\n' --in ;;
    move) printf '%s\n' --to --name ;;
    untrash) printf '%s\n' --to ;;
    favorite | used) printf '%s\n' --clear ;;
    purge) printf '%s\n' --older-than ;;
    thumbnail) printf '%s\n' --out ;;
    serve) printf '%s\n' --port --no-browser --no-address --keep-trash ;;
    browse) printf '%s\n' --no-open ;;
    esac
}

_marrowdale() {
    local current=${COMP_WORDS[COMP_CWORD]} previous=${COMP_WORDS[COMP_CWORD - 1]} command='' i
    local commands='ls info id path page search anchor changes watch import mkdir rename move trash
        untrash delete tag favorite used purge apps app refresh thumbnail serve browse doctor'
    COMPREPLY=()
    for ((i = 1; i < COMP_CWORD; i++)); do
        case ${COMP_WORDS[i]} in
        --root | --state) ((i++)) ;;
        -*) ;;
        *)
            command=${COMP_WORDS[i]}
            break
            ;;
        esac
    done
    case $previous in
    --root | --state | --out)
        compopt -o filenames
        mapfile -t COMPREPLY < <(compgen -d -- "$current")
        return
        ;;
    --keep-trash)
        mapfile -t COMPREPLY < <(compgen -W 'forever 7 30 90' -- "$current")
        return
        ;;
    --page)
        mapfile -t COMPREPLY < <(compgen -W 'name date' -- "$current")
        return
        ;;
    --since | --name | --older-than | --port) return ;;
    esac
    if [[ $current == -* ]]; then
        mapfile -t COMPREPLY < <(compgen -W "--root --state --json --verbose --help
            $([[ -n $command ]] && _marrowdale_options "$command" || printf %s --version)" -- "$current")
    elif [[ -z $command ]]; then
        mapfile -t COMPREPLY < <(compgen -W "$commands" -- "$current")
    else
        compopt -o filenames
        mapfile -t COMPREPLY < <(
            case $current in
            /* | ./* | ../* | '~'*) compgen -f -- "$current" ;;
            '') compgen -W 'root working-set all-directories ./ /' ;;
            *)
                compgen -W 'root working-set all-directories' -- "$current"
                [[ $command == import || $command == id ]] && compgen -f -- "$current"
                ;;
            esac
        )
    fi
}

complete -F _marrowdale marrowdale
