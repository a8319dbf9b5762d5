#!/bin/zsh -f
# Prints what an interactive zsh offers for each line of a file when TAB is pressed at its end:
# offers.zsh COMPLETIONS LINES
zmodload zsh/zpty || exit 77
# Beside the lines, where there is room for them.
offers=${2:h}/offers.zsh
setup=${2:h}/setup.zsh

: >$offers
cat >$setup <<'END'
unsetopt beep
autoload -Uz compinit
fpath=($completions $fpath)
compinit -u -D
# Keeps what is offered, then offers it.
compadd() {
  local -a words
  if [[ ${@[1,(i)(-|--)]} != *-(O|A|D)\ * ]]; then
    builtin compadd -O words "$@"
    offered+=($IPREFIX$^words)
  fi
  builtin compadd "$@"
}
tell() {
  print -r -- "$typed|$offered" >>$offers
  comppostfuncs=(tell)
}
start() {
  typed=$BUFFER
  offered=()
  comppostfuncs=(tell)
  zle complete-word
  zle kill-whole-line
}
zle -N start
bindkey '^I' start
print ready >>$offers
END

lines() { print ${#${(f)"$(<$offers)"}} }
wait_for_lines() {
  local -i i
  for ((i = 0; i < 400; ++i)); do
    (( $(lines) >= $1 )) && return
    sleep 0.05
  done
  print -u2 "zsh does not answer"
  exit 1
}

zpty -b shell "TERM=dumb zsh -f -i"
zpty -w shell "completions=${(q)1} offers=${(q)offers}; source ${(q)setup}"
integer count=1
wait_for_lines 1
while IFS= read -r line; do
  zpty -w -n shell "$line"$'\t'
  (( ++count ))
  wait_for_lines $count
  while zpty -r -t shell answer; do :; done
done <$2
zpty -d shell
tail -n +2 $offers
