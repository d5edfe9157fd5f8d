# Completion of veltctl for bash. Works with and without the bash-completion package.

# The words that may follow a command; nothing for a command that takes words of the user's own.
_veltctl_words() {
    local ftp='enable_ftp= enable_ftps= timeout= portnum= custom_port_range= custom_port= use_ext_ip= ext_ip= enable_fxp=
        enable_ascii= enable_fips= enable_flow_ctrl= maxuploadrate= maxdownloadrate= max_conn_per_ip='
    case $1 in
        '') echo 'status doctor restart log events ftp security sftp confinement shares chroot history diff undo confirm access sessions kick transfers bans keys tokens export import call' ;;
        ftp | security | sftp | confinement) echo 'get set' ;;
        'ftp set') echo "$ftp utf8_mode=" ;;
        'security set') echo 'user_chroot= anonymous= anonymous_chroot= anonymous_chroot_share= enable_umask=' ;;
        'sftp set') echo 'enable= portnum=' ;;
        'confinement set') echo 'sftp=' ;;
        chroot) echo 'users rules' ;;
        restart) echo 'ftp sftp' ;;
        'chroot users') echo 'list add delete' ;;
        'chroot rules') echo 'load save add remove' ;;
        'chroot rules add' | 'chroot rules remove') echo 'user group' ;;
        bans) echo 'list lift' ;;
        keys) echo 'list add remove import' ;;
        tokens) echo 'list create delete' ;;
    esac
}

# The options of a command, beside those that every command has.
_veltctl_options() {
    echo '--help --json --url --socket --token-file --ca-file --timeout'
    case $1 in
        '') echo '--version' ;;
        log) echo '--since --event --actor --before --limit --all --follow' ;;
        events) echo '--count --kind' ;;
        sessions) echo '--user --address --protocol --watch' ;;
        kick) echo '--user --address --reason --dry-run' ;;
        transfers) echo '--user --session --share --path --operation --result --from --until --before --limit --all --csv' ;;
        'ftp get') echo '--api-version' ;;
        'ftp set' | 'security set' | 'sftp set' | 'confinement set' | 'chroot users add' | 'chroot users delete' | 'chroot rules save' | \
            'chroot rules add' | 'chroot rules remove' | undo | import)
            echo '--dry-run --keep-sessions --end-sessions --confirm-within' ;;
        history) echo '--before --limit' ;;
        restart) echo '--dry-run --end-sessions' ;;
        confirm | 'bans lift' | 'keys add' | 'keys remove' | 'keys import' | 'tokens delete') echo '--dry-run' ;;
        'chroot users list') echo '--others --offset --limit --type --domain --filter' ;;
        'tokens create') echo '--dry-run --role' ;;
        export) echo '--output' ;;
        call) echo '--dry-run --keep-sessions --end-sessions --confirm-within --list' ;;
    esac
}

# Whether the option takes the word behind it.
_veltctl_takes_word() {
    case $1 in
        --url | --socket | --token-file | --ca-file | --timeout | --since | --event | --actor | --before | --limit | \
            --count | --kind | --api-version | --offset | --type | --domain | --filter | --role | --output | --confirm-within | \
            --user | --address | --protocol | --reason | --session | --share | --path | --operation | --result | --from | --until | \
            -o) return 0 ;;
    esac
    return 1
}

# Sets COMPREPLY to the value of an option. False when it is one that cannot be known.
_veltctl_option_value() {
    case $1 in
        --type) COMPREPLY=($(compgen -W 'local domain ldap all' -- "$2")) ;;
        --kind) COMPREPLY=($(compgen -W 'service log ban change session transfer operation' -- "$2")) ;;
        --protocol) COMPREPLY=($(compgen -W 'ftp ftps sftp' -- "$2")) ;;
        --operation)
            COMPREPLY=($(compgen -W 'upload download delete rename make-folder remove-folder mode owner times link truncate
                session-opened session-closed login-refused' -- "$2")) ;;
        --result) COMPREPLY=($(compgen -W 'done incomplete refused' -- "$2")) ;;
        --role) COMPREPLY=($(compgen -W 'admin viewer' -- "$2")) ;;
        --api-version) COMPREPLY=($(compgen -W '1 2 3' -- "$2")) ;;
        --socket | --token-file | --ca-file | --output | -o) _veltctl_files "$2" ;;
    esac
}

_veltctl_files() {
    compopt -o filenames 2>/dev/null
    mapfile -t COMPREPLY < <(compgen -f -- "$1")
}

# The value of a setting: those that are on or off have names that tell so, or are listed here.
_veltctl_setting_value() {
    case $1 in
        enable | enable_* | use_* | custom_port_range | user_chroot | anonymous | anonymous_chroot | sftp)
            COMPREPLY=($(compgen -W 'on off' -- "$2")) ;;
        utf8_mode) COMPREPLY=($(compgen -W '0 1 2' -- "$2")) ;;
    esac
}

# The command so far, without options and their values, into the variable `command`.
_veltctl_command() {
    local i word
    command=
    for ((i = 1; i < COMP_CWORD; i++)); do
        word=${COMP_WORDS[i]}
        if _veltctl_takes_word "$word"; then
            ((i++))
            [ "${COMP_WORDS[i]}" != '=' ] || ((i++)) # --url=... stands as three words
        elif [[ $word != -* ]]; then
            # Only words that lead on belong to the command; the rest are its arguments.
            [[ " $(_veltctl_words "$command" | tr '\n' ' ') " == *" $word "* ]] || break
            command=${command:+$command }$word
        fi
    done
}

_veltctl() {
    local current=${COMP_WORDS[COMP_CWORD]} previous=${COMP_WORDS[COMP_CWORD - 1]} command
    COMPREPLY=()
    # The shell takes "=" for a word of its own: key=value is three words.
    if [ "$current" = '=' ]; then
        current=
        previous='='
        local key=${COMP_WORDS[COMP_CWORD - 1]}
    else
        local key=${COMP_WORDS[COMP_CWORD - 2]:-}
    fi
    if [ "$previous" = '=' ]; then
        case $key in
            --*) _veltctl_option_value "$key" "$current" ;;
            *) _veltctl_setting_value "$key" "$current" ;;
        esac
        return
    fi
    if _veltctl_takes_word "$previous"; then
        _veltctl_option_value "$previous" "$current"
        return
    fi
    _veltctl_command
    if [[ $current == -* ]]; then
        COMPREPLY=($(compgen -W "$(_veltctl_options "$command")" -- "$current"))
        return
    fi
    case $command in
        import | diff | 'chroot rules save' | 'keys add' | 'keys import') _veltctl_files "$current" ;;
        *) COMPREPLY=($(compgen -W "$(_veltctl_words "$command")" -- "$current")) ;;
    esac
    [[ ${COMPREPLY[*]:-} != *= ]] || compopt -o nospace 2>/dev/null
}

complete -F _veltctl veltctl
