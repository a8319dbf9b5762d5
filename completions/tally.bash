# Completion of tally(8) and ksicache(8) for bash, with or without bash-completion. docs/refresh
# makes the tables.
# shellcheck shell=bash

# BEGIN bash_reports
_tally_reports='
  group-stats vm-stats uw-stats buddy-stats pshare-stats pshareHint-stats swap-stats
  comp-stats lpool-stats heap-stats guest-stats zip-stats lpage-stats asyncremap-stats
  pmem-stats
'
declare -gA _tally_options=(
  [group-stats]='
    -v --verbose -s --cSelect -q --csvMode -g --gid -l --level -u --unit -i --iFilter -e
    --eFilter -t --tags
  '
  [vm-stats]='
    -v --verbose -s --cSelect -q --csvMode -g --gid -l --level -u --unit
  '
  [uw-stats]='
    -v --verbose -s --cSelect -q --csvMode -g --gid -l --level -u --unit -i --iFilter -e
    --eFilter
  '
  [buddy-stats]='
    -v --verbose -s --cSelect -q --csvMode
  '
  [pshare-stats]='
    -v --verbose -s --cSelect -q --csvMode -u --unit
  '
  [pshareHint-stats]='
    -v --verbose -s --cSelect -q --csvMode -u --unit
  '
  [swap-stats]='
    -v --verbose -s --cSelect -q --csvMode -g --gid -l --level -u --unit
  '
  [comp-stats]='
    -v --verbose -s --cSelect -q --csvMode -u --unit
  '
  [lpool-stats]='
    -v --verbose -s --cSelect -q --csvMode
  '
  [heap-stats]='
    -v -s --cSelect -q --csvMode -u --unit
  '
  [guest-stats]='
    -v --verbose -s --cSelect -q --csvMode -g --gid -l --level -u --unit
  '
  [zip-stats]='
    -v --verbose -s --cSelect -q --csvMode -g --gid -l --level -u --unit
  '
  [lpage-stats]='
    -v --verbose -s --cSelect -q --csvMode -g --gid -l --level -u --unit
  '
  [asyncremap-stats]='
    -v --verbose -s --cSelect -q --csvMode -g --gid -u --unit
  '
  [pmem-stats]='
    -v --verbose -s --cSelect -q --csvMode -l --level -u --unit
  '
)
declare -gA _tally_units=(
  [group-stats]='
    mb kb pg
  '
  [vm-stats]='
    mb kb pg
  '
  [uw-stats]='
    mb kb pg
  '
  [pshare-stats]='
    mb kb pg
  '
  [pshareHint-stats]='
    mb kb pg
  '
  [swap-stats]='
    mb kb pg
  '
  [comp-stats]='
    mb kb pg
  '
  [heap-stats]='
    mb kb pg b
  '
  [guest-stats]='
    mb kb pg
  '
  [zip-stats]='
    mb kb pg
  '
  [lpage-stats]='
    mb kb pg
  '
  [asyncremap-stats]='
    mb kb pg
  '
  [pmem-stats]='
    mb kb pg
  '
)
declare -gA _tally_flags=(
  [group-stats]='
    pre lf vm uw sys tw pr sd np ke ug co sc vmm usr
  '
  [uw-stats]='
    uw vm
  '
)
declare -gA _tally_columns=(
  [group-stats]='
    gid name parGid nChild min max minLimit shares conResv availResv memSize memSizePeak iMin
    eMin eMinPeak rMinPeak bMin bMax bShares fShares ovhdResv ovhd allocTgt consumed
    consumedPeak touched bActive sharedSaved mps throttlePct flags tag
  '
  [vm-stats]='
    name b schedGrp parSchedGroup worldGrp memSizeLimit memSize min max minLimit shares
    ovhdResv ovhd allocTgt consumed balloonTgt ballooned swapTgt swapped mapped touched
    zipped vpmemRO vpmemRW vpmemUC zipSaved shared zero sharedSaved useReliableMem swapScope
  '
  [uw-stats]='
    type name schedGrp parSchedGroup worldGrp min max minLimit shares totalResv pinnedResv
    memSizeLimit memSize memBStore swapBStore mapped touched swappable cow pageable
    pageableUnacct pinned prealloced shm allocTgt consumed swapTgt swapped useReliableMem
    swapScope
  '
  [buddy-stats]='
    name memNode type numaNode 4KBfree 8KBfree 16KBfree 32KBfree 64KBfree 128KBfree 256KBfree
    512KBfree 1MBfree 2MBfree 4MBfree 8MBfree 16MBfree 32MBfree 64MBfree 128MBfree 256MBfree
    512MBfree 1GBfree 4KBused 8KBused 16KBused 32KBused 64KBused 128KBused 256KBused
    512KBused 1MBused 2MBused 4MBused 8MBused 16MBused 32MBused 64MBused 128MBused 256MBused
    512MBused 1GBused
  '
  [pshare-stats]='
    cow cow1 zero used reclaimed totAdd totRemove
  '
  [pshareHint-stats]='
    type totAdd totRemove active
  '
  [swap-stats]='
    name schedGrp parSchedGroup worldGrp isSwapping CurSwapper cacheUsage swapoutReady
    swapTgt swapped swapRead swapIn swapOut discarded COWSwapper vmmSwapOn knvSwapOn
    llswapped llswapUsed totalReg freeReg cptTgt cptRead cptWritten totalMig freeMig
    gblSwapRead gblSwapIn gblSwapOut
  '
  [comp-stats]='
    total discarded managedByMemMap reliableMem kernelCode critical dataAndHeap buddyOvhd
    rsvdLow managedByMemSched minFree knvClientConsumed otherConsumed free numHigh numClear
    numSoft numHard numLow memState
  '
  [lpool-stats]='
    name nodeID nrLPages nrFreeSPages nrSPageAllocs nrSPageFrees nrReapAttempts
    nrSPagesReaped nrDefragAttempts nrDefragCancelled nrDefragReaped nrLPagesDefragged
    peakDefragAttempts nrCachehit
  '
  [heap-stats]='
    name dynGrow lowerLimit upperLimit reserved numRanges dlMallocOvdh used avail size
    initial max pctFreeOfCur maxAvail pctFreeOfMax lowPctFreeOfMax numSuccAllocs
    numFailAllocs numGrowthOps numShrinkOps numReqsPerGrowth avgAllocSize
  '
  [guest-stats]='
    name schedGrp parSchedGroup worldGrp memTotal lpageTotal memNeeded
  '
  [zip-stats]='
    name schedGrp parSchedGroup worldGrp totalCache maxCache usedCache zipped unZipped
    zipRejected nrFreeHalf nrFreeQuarter avgZipTime avgUnzipTime
  '
  [lpage-stats]='
    name schedGrp parSchedGroup worldGrp nrBackings nrAllocSuccess nrLocked nrBroken
    maxSwapThreshold nrFailPinned nrFailSwapped nrFailPinnedLate nrFailNoMem
  '
  [asyncremap-stats]='
    name grpLeader type added prepared filtered staged remapped canceled cUnprepared
    cPrepared cStaged
  '
  [pmem-stats]='
    uuid alloc2MBlocks resvd2MBlocks avail2MBlocks totalRegions freeRegions total2MBlocks
    isClean regionUuid size reserved flags
  '
)
# END
# BEGIN bash_nodes
_ksicache_nodes='
sched/groups/groupName
sched/groups/groupTag
sched/groups/parentGroupID
sched/groups/groupFlags
sched/groups/groupLeaderID
sched/groups/memAllocationInKB
sched/groups/stats/capacity
sched/groups/stats/memoryStats
sched/groups/members/groups
sched/groups/members/memClients
sched/memClients/tally/totalCommon
sched/memClients/tally/vmm
sched/memClients/tally/uw
sched/memClients/tally/guest
sched/memClients/swapInfo
sched/memClients/memzipInfo
sched/memClients/remapTypes
worldGroups/vmmLeaderID
sched/globalStats/numVMs
sched/globalStats/memory/tally
sched/globalStats/memory/stateTransitions
memory/comprehensive
memory/memInfo
memory/memNodes
memory/pshare/stats
system/buddy
system/buddy/comprehensive
system/heaps
system/heaps/stats
memory/lpage/vmLPage
memory/lpage/nodeList/psharePool
memory/lpage/nodeList/vmPools
memory/pmem/volumes
memory/pmem/volumes/info
memory/pmem/volumes/regionStore/info
memory/pmem/volumes/regionStore/isClean
memory/pmem/volumes/regionStore/regions
memory/pmem/volumes/regionStore/regions/info
'
# END

# The command line up to the cursor as the programs will see it, in _tally_line: readline takes it
# apart at ':' and '=', too.
_tally_split() {
  local line=${COMP_LINE:0:COMP_POINT} blank word i
  _tally_line=()
  for ((i = 0; i <= COMP_CWORD; ++i)); do
    blank=${line%%[![:blank:]]*}
    line=${line#"$blank"}
    if ((i < COMP_CWORD)); then word=${COMP_WORDS[i]}; else word=$line; fi
    if [[ -n $blank || $i -eq 0 ]]; then
      _tally_line+=("$word")
    else
      _tally_line[-1]+=$word
    fi
    line=${line#"$word"}
  done
}

# _tally_reply HEAD START WORDS offers those of the words that begin with START, in any case. HEAD
# stands before them on the command line; what readline takes for words of their own is left out.
_tally_reply() {
  local word breaks=${COMP_WORDBREAKS//[!:=]/} kept=$1
  if [[ -n $breaks ]]; then kept=${1##*["$breaks"]}; fi
  for word in $3; do
    if [[ ${word,,} == "${2,,}"* ]]; then COMPREPLY+=("$kept$word"); fi
  done
}

# The same for one more word of a list joined by ':', or by $4.
_tally_reply_list() {
  local by=${4:-:} word words=
  local start=${2##*"$by"}
  local used=${2%"$start"}
  for word in $3; do
    if [[ "$by${used,,}" != *"$by${word,,}$by"* ]]; then words+=" $word"; fi
  done
  compopt -o nospace
  _tally_reply "$1$used" "$start" "$words"
}

# The same for files, with the options of compgen that select them.
_tally_reply_files() {
  local files
  mapfile -t files < <(compgen "${@:3}" -- "$2")
  compopt -o filenames
  if [[ -n $1 && $COMP_WORDBREAKS != *=* ]]; then files=("${files[@]/#/$1}"); fi
  COMPREPLY+=("${files[@]}")
}

# Reads an option: its letter in option, its value in value if it is part of the word, and what
# stands before that in head. Options without a value have no letter.
_tally_option() {
  local with_value=fcr
  if [[ -n $report ]]; then with_value=gluies; fi
  option='' value='' head=''
  case $1 in
    --*)
      case ${1%%=*} in
        --cache) option=c ;;
        --report) option=r ;;
        --gid) option=g ;;
        --level) option=l ;;
        --unit) option=u ;;
        --iFilter) option=i ;;
        --eFilter) option=e ;;
        --cSelect) option=s ;;
      esac
      if [[ $1 == *=* ]]; then value=${1#*=} head=${1%%=*}=; fi
      ;;
    -?*)
      option=${1#-}
      option=${option#"${option%%["$with_value"]*}"}
      value=${option:1}
      option=${option:0:1}
      if [[ -n $value ]]; then head=${1%"$value"}; fi
      ;;
  esac
  if [[ $with_value != *"$option"* ]]; then option=''; fi
}

_tally() {
  local _tally_line word name i report='' option='' value='' head=''
  COMPREPLY=()
  _tally_split
  for ((i = 1; i < ${#_tally_line[@]} - 1; ++i)); do
    word=${_tally_line[i]}
    if [[ -n $option && -z $head ]]; then
      value=$word
    else
      _tally_option "$word"
      if [[ -n $option && -z $head ]]; then continue; fi
    fi
    if [[ $option == r ]]; then
      for name in $_tally_reports; do
        if [[ ${name,,} == "${value,,}" ]]; then report=$name; fi
      done
    fi
    option='' head=''
  done

  word=${_tally_line[-1]}
  if [[ -n $option ]]; then
    value=$word head=
  else
    _tally_option "$word"
    if [[ -n $option && -z $head ]]; then option=''; fi
  fi
  case $option in
    r) _tally_reply "$head" "$value" "$_tally_reports" ;;
    c) _tally_reply_files "$head" "$value" -f ;;
    u) _tally_reply "$head" "$value" "${_tally_units[$report]-}" ;;
    i | e) _tally_reply_list "$head" "$value" "${_tally_flags[$report]-}" ;;
    s) _tally_reply_list "$head" "$value" "${_tally_columns[$report]-}" ;;
    '')
      if [[ -n $report ]]; then
        _tally_reply '' "$word" "${_tally_options[$report]}"
      else
        _tally_reply '' "$word" '-r --report -c --cache -f --force -h --help'
      fi
      ;;
  esac
}

# What the options of ksicache may be given.
declare -gA _ksicache_values=(
  [--mode]='0600 0640 0644'
  [--every]='1s 5s 10s 30s 1m'
  [--keep]='1d 7d 30d'
  [--max-size]='500M 1G 2G'
  [--format]='csv json sqlite openmetrics prometheus clickhouse-schema'
  [--unit]='mb kb pg b'
  [--top]='3 5 10 20'
  [--since]='1h 6h 1d 7d'
  [--fail-above]='100M 500M 1G'
)

_ksicache() {
  local _tally_line word command='' count=0 skip='' head='' i
  local valued='root|mode|every|keep|max-size|count|format|unit|output|cluster|columns|group|levels|include|exclude|files-from|report|by|top|since|fail-above|title|zone'
  COMPREPLY=()
  _tally_split
  for word in "${_tally_line[@]:1:${#_tally_line[@]}-2}"; do
    if [[ -n $skip ]]; then
      skip=
    elif [[ $word =~ ^(--($valued)|-[uorsglie])$ ]]; then
      skip=$word
    elif [[ $word != -* ]]; then
      if [[ -z $command ]]; then command=$word; else count=$((count + 1)); fi
    fi
  done

  word=${_tally_line[-1]}
  if [[ -z $skip && $word == --*=* ]]; then
    skip=${word%%=*} head=${word%%=*}= word=${word#*=}
  fi
  case $skip in
    -u) skip=--unit ;;
    -o) skip=--output ;;
    -r) skip=--report ;;
    -s) skip=--columns ;;
    -g) skip=--group ;;
    -l) skip=--levels ;;
    -i) skip=--include ;;
    -e) skip=--exclude ;;
  esac
  if [[ $skip == --root ]]; then
    _tally_reply_files "$head" "$word" -d
  elif [[ $skip == --output || $skip == --files-from ]]; then
    _tally_reply_files "$head" "$word" -f
  elif [[ $skip == --report ]]; then
    _tally_reply "$head" "$word" "$_tally_reports"
  elif [[ -n $skip ]]; then
    _tally_reply "$head" "$word" "${_ksicache_values[$skip]-}"
  elif [[ $word == -* ]]; then
    case $command in
      capture) _tally_reply '' "$word" '--force --mode --root' ;;
      record) _tally_reply '' "$word" '--every --keep --max-size --count --mode --root' ;;
      moments) _tally_reply '' "$word" '--remarks --summary' ;;
      dump) _tally_reply '' "$word" --json ;;
      diff)
        _tally_reply '' "$word" \
          '--report -r --by --top --since --unit -u --json --fail-above --across-hosts'
        ;;
      export)
        _tally_reply '' "$word" \
          '--format --unit -u --columns -s --group -g --levels -l --include -i --exclude -e --every --files-from --output -o --append --force --mode --cluster'
        ;;
      load | extract | join) _tally_reply '' "$word" '--force --mode' ;;
      page) _tally_reply '' "$word" '--output -o --title --zone --force --mode' ;;
      '') _tally_reply '' "$word" '-h --help --version' ;;
    esac
  else
    case $command$count in
      0)
        _tally_reply '' "$word" 'capture record moments extract join info dump diff export page load check'
        ;;
      capture0 | record0 | moments* | extract[01] | join* | info* | dump0 | diff[01] | page0 | check* | load[01])
        _tally_reply_files '' "$word" -f
        ;;
      dump*) _tally_reply '' "$word" "$_ksicache_nodes" ;;
      export0) _tally_reply_list '' "$word" "all $_tally_reports" , ;;
      export*) _tally_reply_files '' "$word" -f ;;
    esac
  fi
}

complete -F _tally tally
complete -F _ksicache ksicache
