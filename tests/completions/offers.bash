#!/bin/bash
# Prints what an interactive bash offers for each line of a file when TAB is pressed at its end:
# offers.bash COMPLETIONS LINES [CHARACTERS that do not break words]
set -euo pipefail

# Beside the lines, where there is room for them.
offers=${2%/*}/offers.bash
: >"$offers"

# Runs inside the interactive shell.
setup() {
  # shellcheck source=../../completions/tally.bash disable=SC2154
  source "$completions/tally.bash"
  COMP_WORDBREAKS=${COMP_WORDBREAKS//["$plain"]/}
  # shellcheck disable=SC2317
  offer() {
    "_$1" "$@"
    local typed=${COMP_LINE##* } breaks=${COMP_WORDBREAKS//[!:=]/} kept=''
    if [[ -n $breaks && $typed == *["$breaks"]* ]]; then
      kept=${typed%"${typed##*["$breaks"]}"}
    fi
    printf '%s|%s\n' "$COMP_LINE" "${COMPREPLY[*]/#/$kept}" >>"$offers"
  }
  complete -F offer tally ksicache
}

export HISTFILE='' INPUTRC=/dev/null TERM=dumb
{
  printf '%s\n' "completions=$1" "plain=${3-}" "offers=$offers" "$(declare -f setup)" setup
  # TAB, and away with the line.
  while IFS= read -r line; do printf '%s\t\x15' "$line"; done <"$2"
  printf 'exit\n'
} | bash --noprofile --norc -i >/dev/null 2>&1
cat "$offers"
