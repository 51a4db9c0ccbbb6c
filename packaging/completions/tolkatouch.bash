# bash completion for tolkatouch and tolkatouchd

_tolkatouch() {
    local cur prev words cword
    _init_completion || return
    local subcommands="replay synth show convert eval sweep plot plot-eval tune record view uhid keys prop devices log watch"
    if [[ $cword -eq 1 ]]; then
        COMPREPLY=($(compgen -W "$subcommands --help --version" -- "$cur"))
        return
    fi
    local options=""
    case ${words[1]} in
        replay) options="--speed --fast --json --set --settings --describe --stats --help" ;;
        synth) options="--output --seed --labels --finger --noise --help" ;;
        show) options="--frame --from --to --summary --json --raw --help" ;;
        convert) options="--output --to --help" ;;
        eval) options="--list --jobs --tolerance --set --settings --json --shard --merge --help" ;;
        sweep) options="--list --jobs --tolerance --set --settings --grid --metric --json --csv --help" ;;
        plot) options="--output --from --to --set --help" ;;
        tune) options="--trials --timeout --space --objective --max-false-activations-per-hour --pareto --heldout --seed --sampler --pruner --storage --study --jobs --tolerance --write-settings --plots --json --help" ;;
        plot-eval) options="--output --kind --setting --metric --point --help" ;;
        record) options="--output --device --vendor --product --duration --max-reports --rotate --with-events --socket --help" ;;
        view) options="--labels --set --port --no-browser --export --from --to --live --socket --help" ;;
        uhid) options="--destroy-after --feature --fail-report --wait-open --settle --linger --wait-signal --vendor --product --name --uhid --help" ;;
        keys) options="--name --wait --timeout --idle --count --help" ;;
        prop)
            if [[ $cword -eq 2 ]]; then
                COMPREPLY=($(compgen -W "get set apply list --help" -- "$cur"))
                return
            fi
            options="--socket --help" ;;
        devices) options="--socket --json --vendor --product --help" ;;
        log)
            if [[ $cur != -* ]]; then
                if [[ $cword -eq 2 ]]; then
                    COMPREPLY=($(compgen -W "HIDService Algs Daemon '*'" -- "$cur"))
                elif [[ $cword -eq 3 ]]; then
                    COMPREPLY=($(compgen -W "debug info default error fault off" -- "$cur"))
                fi
                return
            fi
            options="--socket --help" ;;
        watch) options="--json --socket --help" ;;
    esac
    case $prev in
        -o|--output|--socket|--uhid|--list|--labels|--device) _filedir; return ;;
        --kind) COMPREPLY=($(compgen -W "confusion metric det" -- "$cur")); return ;;
        --metric) [[ ${words[1]} == plot-eval ]] && { COMPREPLY=($(compgen -W "F1 Precision Recall" -- "$cur")); return; } ;;
        --finger) COMPREPLY=($(compgen -W "light normal heavy" -- "$cur")); return ;;
        --to) COMPREPLY=($(compgen -W "document lines" -- "$cur")); return ;;
    esac
    if [[ $cur == -* ]]; then
        COMPREPLY=($(compgen -W "$options" -- "$cur"))
    else
        _filedir
    fi
}
complete -F _tolkatouch tolkatouch

_tolkatouchd() {
    local cur prev words cword
    _init_completion || return
    case $prev in
        --plugin|--socket|--key-log|--uinput|--simulate|--log-config) _filedir; return ;;
        --log-level) COMPREPLY=($(compgen -W "debug info default error fault off Algs= HIDService= Daemon=" -- "$cur")); return ;;
    esac
    COMPREPLY=($(compgen -W "--help --vendor --product --plugin --socket --print --no-keys --key-log --uinput --simulate --speed --debug --log-config --log-level --version" -- "$cur"))
}
complete -F _tolkatouchd tolkatouchd
