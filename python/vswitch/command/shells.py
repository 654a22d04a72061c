"""How shells ask what a word may be, and the scripts that have them do so.

All tell the line as far as it is typed, with nothing taken apart, and are told in each line what
kind of word may follow, a comma, and the word: `plain`, or `file` or `dir`, of which a shell knows
itself what there is. After a name that wants a value, no blank is put in.
"""

import os
from typing import List, Tuple

from click.parser import split_arg_string
from click.shell_completion import CompletionItem, ShellComplete, add_completion_class

__all__ = ["VARIABLE"]

VARIABLE = "_VSWITCH_COMPLETE"
"""What tells the program which shell asks."""


class _Shell(ShellComplete):
    def get_completion_args(self) -> Tuple[List[str], str]:
        line = os.environ["COMP_WORDS"]
        words = split_arg_string(line)
        begun = words.pop() if words and not line[-1].isspace() else ""
        return words[1:], begun

    def format_completion(self, item: CompletionItem) -> str:
        return f"{item.type},{item.value}"


@add_completion_class
class _Bash(_Shell):
    """Takes words apart at more than blanks, as at "=", and puts in what follows the last."""

    name = "bash"
    source_template = """\
%(complete_func)s() {
    local line=${COMP_LINE:0:COMP_POINT} offered kind value
    offered=$(env COMP_WORDS="$line" %(complete_var)s=bash_complete "$1") || return
    local word=${line##*[[:space:]]}
    local before=${word%%"$2"}
    while IFS=, read -r kind value; do
        case $kind in
        plain) COMPREPLY+=("${value#"$before"}") ;;
        file) compopt -o default ;;
        dir) compopt -o dirnames ;;
        esac
    done <<<"$offered"
    [[ ${COMPREPLY-} != *= ]] || compopt -o nospace
}

complete -o nosort -F %(complete_func)s %(prog_name)s
"""


@add_completion_class
class _Zsh(_Shell):
    """Runs the script as a function where it finds it by itself, and as a script otherwise."""

    name = "zsh"
    source_template = """\
#compdef %(prog_name)s

%(complete_func)s() {
    local line="${(j: :)words[1,CURRENT]}" kind value
    local -a names wanting
    env COMP_WORDS="$line" %(complete_var)s=zsh_complete $words[1] |
    while IFS=, read -r kind value; do
        case $kind in
        plain) if [[ $value == *= ]]; then wanting+=("$value"); else names+=("$value"); fi ;;
        file) _files ;;
        dir) _files -/ ;;
        esac
    done
    (( $#wanting == 0 )) || compadd -U -S '' -V unsorted -a wanting
    (( $#names == 0 )) || compadd -U -V unsorted -a names
}

if [[ $zsh_eval_context[-1] == loadautofunc ]]; then
    %(complete_func)s "$@"
else
    compdef %(complete_func)s %(prog_name)s
fi
"""


@add_completion_class
class _Fish(_Shell):
    name = "fish"
    source_template = """\
function %(complete_func)s
    for offered in (env COMP_WORDS=(commandline -cp) %(complete_var)s=fish_complete %(prog_name)s)
        set -l parts (string split --max 1 , $offered)
        switch $parts[1]
            case plain
                echo $parts[2]
            case file
                __fish_complete_path (commandline -ct)
            case dir
                __fish_complete_directories (commandline -ct)
        end
    end
end

complete --no-files --command %(prog_name)s --arguments "(%(complete_func)s)"
"""
