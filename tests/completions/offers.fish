#!/usr/bin/env -S fish --no-config
# Prints what fish offers for each line of a file: offers.fish COMPLETIONS LINES
source $argv[1]/tally.fish
source $argv[1]/ksicache.fish
while read -l line
    printf '%s|%s\n' $line (complete -C $line | string split -f 1 \t | string join ' ')
end <$argv[2]
