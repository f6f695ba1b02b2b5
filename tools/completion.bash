# Completion for zopt: its options and their words, as --help tells them, then files.
_zopt() {
    local word=${COMP_WORDS[COMP_CWORD]} line=${COMP_LINE:0:COMP_POINT} help
    word=${line##* } # with what stands in front of "=" and ":"
    help=$("${COMP_WORDS[0]}" --help 2>/dev/null)
    if [[ $word == --*=* ]]; then
        local words
        words=$(sed -n "s/^ *${word%%=*}=.*{\(.*\)}.*/\1/p" <<<"$help" | tr , ' ')
        mapfile -t COMPREPLY < <(compgen -W "$words" -- "${word#*=}")
    elif [[ $word == -* ]]; then
        mapfile -t COMPREPLY < <(compgen -W "$(grep -oE -- '--[a-zA-Z0-9_:]+=?' <<<"$help" | sort -u)" -- "$word")
        if [[ $word == *:* ]]; then COMPREPLY=("${COMPREPLY[@]#"${word%:*}:"}"); fi
        if [[ ${COMPREPLY[0]-} == *= ]]; then compopt -o nospace; fi
    else
        mapfile -t COMPREPLY < <(compgen -f -- "$word")
    fi
}
complete -o filenames -F _zopt zopt
