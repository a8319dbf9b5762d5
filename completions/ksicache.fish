# Completion of ksicache(8) for fish. docs/refresh makes the lists of nodes and reports.

# BEGIN fish_nodes
function __ksicache_nodes
    printf "%s\n" \
       sched/groups/groupName \
       sched/groups/groupTag \
       sched/groups/parentGroupID \
       sched/groups/groupFlags \
       sched/groups/groupLeaderID \
       sched/groups/memAllocationInKB \
       sched/groups/stats/capacity \
       sched/groups/stats/memoryStats \
       sched/groups/members/groups \
       sched/groups/members/memClients \
       sched/memClients/tally/totalCommon \
       sched/memClients/tally/vmm \
       sched/memClients/tally/uw \
       sched/memClients/tally/guest \
       sched/memClients/swapInfo \
       sched/memClients/memzipInfo \
       sched/memClients/remapTypes \
       worldGroups/vmmLeaderID \
       sched/globalStats/numVMs \
       sched/globalStats/memory/tally \
       sched/globalStats/memory/stateTransitions \
       memory/comprehensive \
       memory/memInfo \
       memory/memNodes \
       memory/pshare/stats \
       system/buddy \
       system/buddy/comprehensive \
       system/heaps \
       system/heaps/stats \
       memory/lpage/vmLPage \
       memory/lpage/nodeList/psharePool \
       memory/lpage/nodeList/vmPools \
       memory/pmem/volumes \
       memory/pmem/volumes/info \
       memory/pmem/volumes/regionStore/info \
       memory/pmem/volumes/regionStore/isClean \
       memory/pmem/volumes/regionStore/regions \
       memory/pmem/volumes/regionStore/regions/info
end
# END

# BEGIN fish_report_names
function __ksicache_report_names
    printf "%s\t%s\n" \
        all 'all fifteen' \
        group-stats 'group stats' \
        vm-stats 'virtual machine stats' \
        uw-stats 'user-world stats' \
        buddy-stats 'memmap buddy stats' \
        pshare-stats 'pshare stats' \
        pshareHint-stats 'pshare hint stats' \
        swap-stats 'virtual machine swap stats' \
        comp-stats 'comprehensive stats' \
        lpool-stats 'lpage pool stats' \
        heap-stats 'heap stats' \
        guest-stats 'guest stats' \
        zip-stats 'virtual machine compression stats' \
        lpage-stats 'virtual machine large page stats' \
        asyncremap-stats 'async_remap stats' \
        pmem-stats 'persistent memory stats'
end
# END

# The reports, and what makes lists of them of what is there.
function __ksicache_reports
    set -l used (commandline -ct | string match -r '.*,')
    __ksicache_report_names | string match -v -r "^("(string replace -a , '|' -- "$used")")\t" | string replace -r '^' "$used"
end

# The command and its arguments so far, one a line.
function __ksicache_words
    set -l words (commandline -opc)
    set -e words[1]
    while set -q words[1]
        switch $words[1]
            case --root --mode --every --keep --max-size --count --format --unit --output --cluster -u -o \
                --columns --files-from -s --group --levels --include --exclude -g -l -i -e \
                --report --by --top --since --fail-above -r
                set -e words[1]
            case '-*'
            case '*'
                echo -- $words[1]
        end
        set -e words[1]
    end
end

# Whether the command is one of the arguments.
function __ksicache_command
    set -l words (__ksicache_words)
    set -q words[1]; and contains -- $words[1] $argv
end

# Whether the next argument of dump is a node.
function __ksicache_wants_node
    set -l words (__ksicache_words)
    test "$words[1]" = dump; and set -q words[2]
end

# Whether the next argument of export is its reports.
function __ksicache_wants_reports
    set -l words (__ksicache_words)
    test "$words[1]" = export; and not set -q words[2]
end

function __ksicache_wants_file
    set -l words (__ksicache_words)
    switch "$words[1]"
        case capture record dump page
            not set -q words[2]
        case info check moments join
            true
        case load extract diff
            not set -q words[3]
        case export
            set -q words[2]
        case '*'
            false
    end
end

set -l no_command 'test -z "$(__ksicache_words)"'
complete -c ksicache -f
complete -c ksicache -n $no_command -a capture -d 'Capture this host'
complete -c ksicache -n $no_command -a record -d 'Record this host over time'
complete -c ksicache -n $no_command -a moments -d 'List the moments of a recording'
complete -c ksicache -n $no_command -a extract -d 'Make a capture of a moment'
complete -c ksicache -n $no_command -a join -d 'Make a recording of captures'
complete -c ksicache -n $no_command -a info -d 'Say which host a file is of'
complete -c ksicache -n $no_command -a dump -d 'Show what a file holds'
complete -c ksicache -n $no_command -a diff -d 'Say what changed, and who grew'
complete -c ksicache -n $no_command -a export -d 'Write the rows of reports'
complete -c ksicache -n $no_command -a page -d 'Make a page for a browser'
complete -c ksicache -n $no_command -a load -d 'Make a file from JSON'
complete -c ksicache -n $no_command -a check -d 'Say what is wrong with a file'
complete -c ksicache -n $no_command -s h -l help -d 'Print a summary'
complete -c ksicache -n $no_command -l version -d 'Print the version'
complete -c ksicache -n __ksicache_wants_file -F
complete -c ksicache -n __ksicache_wants_node -a '(__ksicache_nodes)'
complete -c ksicache -n __ksicache_wants_reports -a '(__ksicache_reports)'
complete -c ksicache -n '__ksicache_command capture load extract join export page' -l force -d 'Replace the file'
complete -c ksicache -n '__ksicache_command capture record load extract join export page' -l mode -x -a '0600 0640 0644' -d 'Give the file these rights'
complete -c ksicache -n '__ksicache_command capture record' -l root -x -a '(__fish_complete_directories)' -d 'Take the host whose files are there'
complete -c ksicache -n '__ksicache_command record' -l every -x -a '1s 5s 10s 30s 1m' -d 'Take a moment so often'
complete -c ksicache -n '__ksicache_command record' -l keep -x -a '1d 7d 30d' -d 'Keep moments so long'
complete -c ksicache -n '__ksicache_command record' -l max-size -x -a '500M 1G 2G' -d 'Let the file grow so large'
complete -c ksicache -n '__ksicache_command record' -l count -x -d 'End after so many moments'
complete -c ksicache -n '__ksicache_command moments' -l remarks -d 'List only moments with something to remark'
complete -c ksicache -n '__ksicache_command moments' -l summary -d 'Sum the moments up instead'
complete -c ksicache -n '__ksicache_command dump diff' -l json -d 'Print JSON'
complete -c ksicache -n '__ksicache_command diff' -s r -l report -x -a '(__ksicache_report_names | string match -v "all*")' -d 'Compare the rows of this report'
complete -c ksicache -n '__ksicache_command diff' -l by -x -d 'Rank by this column'
complete -c ksicache -n '__ksicache_command diff' -l top -x -a '3 5 10 20' -d 'Show so many of each kind'
complete -c ksicache -n '__ksicache_command diff' -l since -x -a '1h 6h 1d 7d' -d 'Say who grew steadily for so long'
complete -c ksicache -n '__ksicache_command diff' -l fail-above -x -a '100M 500M 1G' -d 'End with status 3 if any grew by more'
complete -c ksicache -n '__ksicache_command diff' -l across-hosts -d 'Compare moments of two hosts'
complete -c ksicache -n '__ksicache_command export' -l format -x -a 'csv json sqlite openmetrics prometheus clickhouse-schema' -d 'Write in this format'
complete -c ksicache -n '__ksicache_command diff export' -s u -l unit -x -a 'mb kb pg b' -d 'Show memory in this unit'
complete -c ksicache -n '__ksicache_command export' -s s -l columns -x -d 'Export only these columns'
complete -c ksicache -n '__ksicache_command export' -s g -l group -x -d 'Export only what is in this group'
complete -c ksicache -n '__ksicache_command export' -s l -l levels -x -a '(seq 12)' -d 'Go down so many levels of groups'
complete -c ksicache -n '__ksicache_command export' -s i -l include -x -d 'Export only groups with one of these flags'
complete -c ksicache -n '__ksicache_command export' -s e -l exclude -x -d 'Export only groups with none of these flags'
complete -c ksicache -n '__ksicache_command export' -l every -x -a '1m 5m 1h 1d' -d 'Take a moment of a recording so often'
complete -c ksicache -n '__ksicache_command export' -l files-from -r -F -d 'Take also the files that this one names'
complete -c ksicache -n '__ksicache_command export' -l append -d 'Add to a database'
complete -c ksicache -n '__ksicache_command export' -l cluster -x -d 'Have tables over all servers of this cluster'
complete -c ksicache -n '__ksicache_command page' -l title -x -d 'Head the page with it'
complete -c ksicache -n '__ksicache_command page' -l zone -x -d 'Tell times also in this zone of the host'
complete -c ksicache -n '__ksicache_command export page' -s o -l output -r -F -d 'Make a file'
