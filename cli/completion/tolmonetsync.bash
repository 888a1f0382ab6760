# bash completion for tolmonetsync: commands, their options, and the values
# that come from a fixed list (--mode, --migrate); paths where a path goes.

_tolmonetsync()
{
    local cur prev words cword
    _init_completion 2>/dev/null || {
        cur=${COMP_WORDS[COMP_CWORD]}
        prev=${COMP_WORDS[COMP_CWORD - 1]}
        words=("${COMP_WORDS[@]}")
        cword=$COMP_CWORD
    }

    local commands="serve login logout status sync demo backups restore doctor help"
    local globals="--server --identity-server --client-id --token --token-file --auto-login --pref-dir
        --allow-shared-pref-dir --company --app --app-version --ca-file --trace --json -q --quiet -h --help"

    case $prev in
        --mode)
            COMPREPLY=($(compgen -W "two-way server-wins local-wins" -- "$cur"))
            return
            ;;
        --migrate)
            COMPREPLY=($(compgen -W "major previous-major" -- "$cur"))
            return
            ;;
        --pref-dir | --data)
            COMPREPLY=($(compgen -d -- "$cur"))
            return
            ;;
        --token-file | --ca-file | --cert | --key | --users-file | --tokens-file)
            COMPREPLY=($(compgen -f -- "$cur"))
            return
            ;;
        --server | --identity-server | --client-id | --token | --company | --app | --app-version | --trace | \
            --user | --listen | --max-upload | --token-ttl | --denied-user | --from | --max-delete | \
            --max-overwrite | --dir | --file)
            return
            ;;
    esac

    # The first word that is neither an option nor an option's value is the command.
    local command="" i
    for ((i = 1; i < cword; i++)); do
        case ${words[i]} in
            --server | --identity-server | --client-id | --token | --token-file | --pref-dir | --company | --app | \
                --app-version | --ca-file | --trace)
                ((i++))
                ;;
            -*) ;;
            *)
                command=${words[i]}
                break
                ;;
        esac
    done

    local options=""
    case $command in
        "")
            COMPREPLY=($(compgen -W "$commands $globals --version" -- "$cur"))
            return
            ;;
        sync)
            options="--mode --dry-run --prune-groups --migrate --dir --file --max-delete --max-overwrite
                --keep-server-copies -v"
            ;;
        doctor) options="--dir --file" ;;
        login) options="--user --password-stdin" ;;
        restore) options="--from" ;;
        serve)
            options="--data --listen --user --users-file --token --tokens-file --token-ttl --max-upload --cert
                --key --denied-user --dev-sign-in-delay-cap"
            ;;
        demo) options="--keep" ;;
    esac
    if [[ $cur == -* || $command != restore ]]; then
        COMPREPLY=($(compgen -W "$options $globals" -- "$cur"))
    else
        COMPREPLY=($(compgen -f -- "$cur"))
    fi
}
complete -F _tolmonetsync tolmonetsync
