# Completion of ipmisel for bash. What there is to complete comes from the program's own help, so that it
# is never out of step with it.

# The help of the command that the line names, or of the program.
_ipmisel_help() {
    local word
    for word in "${COMP_WORDS[@]:1:COMP_CWORD-1}"; do
        if [[ $word != -* ]]; then
            "${COMP_WORDS[0]}" "$word" --help 2>/dev/null
            return
        fi
    done
    "${COMP_WORDS[0]}" --help 2>/dev/null
}

# What the help says that an option takes: "LEVEL:user, admin=admin"; nothing where it takes nothing.
_ipmisel_takes() {
    sed -n "s/^  \(-[^ ]*,\)\{0,1\}$2 \([A-Z].*\)\$/\2/p" <<<"$1" | head -n 1
}

# The hosts of the configuration, and its groups as %NAME.
_ipmisel_hosts() {
    "${COMP_WORDS[0]}" config --hosts 2>/dev/null | head -n 1000
}

# The words that begin with $2 and may stand for what an option takes.
_ipmisel_values() {
    local takes=$1 word=$2
    case ${takes%% *} in
    *:*)
        takes=${takes#*:}
        takes=${takes%%=*}
        compgen -W "${takes//,/ }" -- "$word"
        ;;
    FILE*) compgen -f -- "$word" ;;
    CLASS*) compgen -W "$("${COMP_WORDS[0]}" classes 2>/dev/null | sed 's/ .*//')" -- "$word" ;;
    LIST*) compgen -W "$(_ipmisel_hosts)" -- "$word" ;;
    SOURCE*) compgen -W "inband lan: sim: replay:" -- "$word" ;;
    esac
}

_ipmisel() {
    local word=${COMP_WORDS[COMP_CWORD]} previous=${COMP_WORDS[COMP_CWORD - 1]}
    local help takes options commands=
    COMPREPLY=()
    # The shell takes "sim:FILE" for three words.
    if [[ $word == : || $previous == : ]]; then
        if [[ $word == : && $previous == lan || ${COMP_WORDS[COMP_CWORD - 2]} == lan ]]; then
            mapfile -t COMPREPLY < <(compgen -W "$(_ipmisel_hosts | grep -v '^%')" -- "${word#:}")
        else
            mapfile -t COMPREPLY < <(compgen -f -- "${word#:}")
        fi
        return
    fi
    help=$(_ipmisel_help)
    [[ $previous == --* ]] && takes=$(_ipmisel_takes "$help" "$previous")
    if [[ -n ${takes:-} ]]; then
        mapfile -t COMPREPLY < <(_ipmisel_values "$takes" "$word")
        [[ ${COMPREPLY[0]:-} == *: ]] && compopt -o nospace 2>/dev/null
        return
    fi
    options=$(sed -n 's/^  \(-[^ ,]*,\)\{0,1\}\(--[a-z-]*\).*/\2/p' <<<"$help")
    [[ $help == *Subcommands:* ]] &&
        commands=$(sed '1,/^Subcommands:/d' <<<"$help" | sed -n 's/^  \([a-z][a-z-]*\) .*/\1/p')
    mapfile -t COMPREPLY < <(compgen -W "$commands $options" -- "$word")
    if [[ $help == *"  SOURCE "* ]]; then
        mapfile -t -O ${#COMPREPLY[@]} COMPREPLY < <(_ipmisel_values SOURCE "$word")
        [[ ${#COMPREPLY[@]} -eq 1 && $COMPREPLY == *: ]] && compopt -o nospace 2>/dev/null
    fi
}
complete -o filenames -F _ipmisel ipmisel
