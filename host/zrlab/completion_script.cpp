#include "host/zrlab/completion.h"

namespace host {

namespace {

constexpr std::string_view kBash =
    R"script(# Completion of zrlab for bash: zrlab itself says what can follow.
_zrlab() {
    local line=${COMP_LINE:0:COMP_POINT} words=() word="" before="" piece at
    # bash splits words at "=" and ":" too: pieces without a blank between them are one word.
    for ((at = 0; at <= COMP_CWORD; ++at)); do
        if [[ $at -eq 0 || $line == [[:space:]]* ]]; then
            [[ $at -gt 0 ]] && words+=("$word")
            word=""
            line=${line#"${line%%[![:space:]]*}"}
        fi
        piece=${COMP_WORDS[at]}
        [[ $at -eq $COMP_CWORD ]] && piece=$line
        before=$word
        word+=$piece
        line=${line#"$piece"}
    done
    words=("${words[@]:1}" "$word")
    words=("${words[@]//[\\\"\']/}")
    word=${words[-1]}

    local candidate text
    COMPREPLY=()
    while IFS=$'\t' read -r candidate text; do
        if [[ $candidate == :files ]]; then
            while IFS= read -r candidate; do
                compopt -o filenames 2>/dev/null
                candidate=$text$candidate
                COMPREPLY+=("${candidate#"$before"}")
            done < <([[ $word == "$text"* ]] && compgen -f -- "${word#"$text"}")
        elif [[ $candidate == "$word"* ]]; then
            COMPREPLY+=("${candidate#"$before"}")
        fi
    done < <("${1/#\~\//${HOME-}/}" complete "${words[@]/#\~\//${HOME-}/}" 2>/dev/null)
    [[ ${#COMPREPLY[@]} -eq 1 && ${COMPREPLY[0]} == *[=:] ]] && compopt -o nospace 2>/dev/null
    return 0
}
complete -F _zrlab zrlab
)script";

constexpr std::string_view kZsh = R"script(#compdef zrlab
# Completion of zrlab for zsh: zrlab itself says what can follow.
_zrlab() {
    local line word prefix files="" failed=1 program=${(Q)words[1]}
    local -a given whole open
    given=("${(@Q)words[2,CURRENT-1]}" "${(Q)PREFIX}")
    for line in ${(f)"$(${program/#\~\//$HOME/} complete "${given[@]}" 2>/dev/null)"}; do
        word=${line%%$'\t'*}
        if [[ $word == :files ]]; then
            files=yes
            prefix=${line#*$'\t'}
        else
            line=${line//:/\\:}
            line=${line/$'\t'/:}
            [[ $word == *[=:] ]] && open+=("$line") || whole+=("$line")
        fi
    done
    _describe -t words zrlab whole -- open -S '' && failed=0
    if [[ -n $files ]] && compset -P "${(b)prefix}"; then
        _files && failed=0
    fi
    return failed
}
if [[ ${funcstack[1]-} == _zrlab ]]; then
    _zrlab "$@"  # loaded by the completion system
else
    # read with "source"
    (( $+functions[compdef] )) || { autoload -Uz compinit && compinit -i }
    compdef _zrlab zrlab
fi
)script";

}  // namespace

std::string_view completionScript(std::string_view shell) {
    return shell == "bash" ? kBash : shell == "zsh" ? kZsh : std::string_view();
}

}  // namespace host
