# Completion of tally(8) for fish. docs/refresh makes the lists.

# BEGIN fish_reports
function __tally_reports
    printf "%s\t%s\n" \
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

function __tally_options -a report
    switch $report
        case group-stats
            printf "%s\t%s\n" \
                -v 'Describe report header labels' \
                --verbose 'Describe report header labels' \
                -s 'Column selection filter' \
                --cSelect 'Column selection filter' \
                -q 'Display output as CSV, not as table' \
                --csvMode 'Display output as CSV, not as table' \
                -g 'Start scheduler group ID' \
                --gid 'Start scheduler group ID' \
                -l 'Levels of hierarchy to display' \
                --level 'Levels of hierarchy to display' \
                -u 'Display unit' \
                --unit 'Display unit' \
                -i 'Inclusion filter' \
                --iFilter 'Inclusion filter' \
                -e 'Exclusion filter' \
                --eFilter 'Exclusion filter' \
                -t 'Display a tag summary' \
                --tags 'Display a tag summary'
        case vm-stats
            printf "%s\t%s\n" \
                -v 'Describe report header labels' \
                --verbose 'Describe report header labels' \
                -s 'Column selection filter' \
                --cSelect 'Column selection filter' \
                -q 'Display output as CSV, not as table' \
                --csvMode 'Display output as CSV, not as table' \
                -g 'Start scheduler group ID' \
                --gid 'Start scheduler group ID' \
                -l 'Levels of hierarchy to display' \
                --level 'Levels of hierarchy to display' \
                -u 'Display unit' \
                --unit 'Display unit'
        case uw-stats
            printf "%s\t%s\n" \
                -v 'Describe report header labels' \
                --verbose 'Describe report header labels' \
                -s 'Column selection filter' \
                --cSelect 'Column selection filter' \
                -q 'Display output as CSV, not as table' \
                --csvMode 'Display output as CSV, not as table' \
                -g 'Start scheduler group ID' \
                --gid 'Start scheduler group ID' \
                -l 'Levels of hierarchy to display' \
                --level 'Levels of hierarchy to display' \
                -u 'Display unit' \
                --unit 'Display unit' \
                -i 'Inclusion filter' \
                --iFilter 'Inclusion filter' \
                -e 'Exclusion filter' \
                --eFilter 'Exclusion filter'
        case buddy-stats
            printf "%s\t%s\n" \
                -v 'Describe report header labels' \
                --verbose 'Describe report header labels' \
                -s 'Column selection filter' \
                --cSelect 'Column selection filter' \
                -q 'Display output as CSV, not as table' \
                --csvMode 'Display output as CSV, not as table'
        case pshare-stats
            printf "%s\t%s\n" \
                -v 'Describe report header labels' \
                --verbose 'Describe report header labels' \
                -s 'Column selection filter' \
                --cSelect 'Column selection filter' \
                -q 'Display output as CSV, not as table' \
                --csvMode 'Display output as CSV, not as table' \
                -u 'Display unit' \
                --unit 'Display unit'
        case pshareHint-stats
            printf "%s\t%s\n" \
                -v 'Describe report header labels' \
                --verbose 'Describe report header labels' \
                -s 'Column selection filter' \
                --cSelect 'Column selection filter' \
                -q 'Display output as CSV, not as table' \
                --csvMode 'Display output as CSV, not as table' \
                -u 'Display unit' \
                --unit 'Display unit'
        case swap-stats
            printf "%s\t%s\n" \
                -v 'Describe report header labels' \
                --verbose 'Describe report header labels' \
                -s 'Column selection filter' \
                --cSelect 'Column selection filter' \
                -q 'Display output as CSV, not as table' \
                --csvMode 'Display output as CSV, not as table' \
                -g 'Start scheduler group ID' \
                --gid 'Start scheduler group ID' \
                -l 'Levels of hierarchy to display' \
                --level 'Levels of hierarchy to display' \
                -u 'Display unit' \
                --unit 'Display unit'
        case comp-stats
            printf "%s\t%s\n" \
                -v 'Describe report header labels' \
                --verbose 'Describe report header labels' \
                -s 'Column selection filter' \
                --cSelect 'Column selection filter' \
                -q 'Display output as CSV, not as table' \
                --csvMode 'Display output as CSV, not as table' \
                -u 'Display unit' \
                --unit 'Display unit'
        case lpool-stats
            printf "%s\t%s\n" \
                -v 'Describe report header labels' \
                --verbose 'Describe report header labels' \
                -s 'Column selection filter' \
                --cSelect 'Column selection filter' \
                -q 'Display output as CSV, not as table' \
                --csvMode 'Display output as CSV, not as table'
        case heap-stats
            printf "%s\t%s\n" \
                -v 'Describe report header labels' \
                -s 'Column selection filter' \
                --cSelect 'Column selection filter' \
                -q 'Display output as CSV, not as table' \
                --csvMode 'Display output as CSV, not as table' \
                -u 'Display unit' \
                --unit 'Display unit'
        case guest-stats
            printf "%s\t%s\n" \
                -v 'Describe report header labels' \
                --verbose 'Describe report header labels' \
                -s 'Column selection filter' \
                --cSelect 'Column selection filter' \
                -q 'Display output as CSV, not as table' \
                --csvMode 'Display output as CSV, not as table' \
                -g 'Start scheduler group ID' \
                --gid 'Start scheduler group ID' \
                -l 'Levels of hierarchy to display' \
                --level 'Levels of hierarchy to display' \
                -u 'Display unit' \
                --unit 'Display unit'
        case zip-stats
            printf "%s\t%s\n" \
                -v 'Describe report header labels' \
                --verbose 'Describe report header labels' \
                -s 'Column selection filter' \
                --cSelect 'Column selection filter' \
                -q 'Display output as CSV, not as table' \
                --csvMode 'Display output as CSV, not as table' \
                -g 'Start scheduler group ID' \
                --gid 'Start scheduler group ID' \
                -l 'Levels of hierarchy to display' \
                --level 'Levels of hierarchy to display' \
                -u 'Display unit' \
                --unit 'Display unit'
        case lpage-stats
            printf "%s\t%s\n" \
                -v 'Describe report header labels' \
                --verbose 'Describe report header labels' \
                -s 'Column selection filter' \
                --cSelect 'Column selection filter' \
                -q 'Display output as CSV, not as table' \
                --csvMode 'Display output as CSV, not as table' \
                -g 'Start scheduler group ID' \
                --gid 'Start scheduler group ID' \
                -l 'Levels of hierarchy to display' \
                --level 'Levels of hierarchy to display' \
                -u 'Display unit' \
                --unit 'Display unit'
        case asyncremap-stats
            printf "%s\t%s\n" \
                -v 'Describe report header labels' \
                --verbose 'Describe report header labels' \
                -s 'Column selection filter' \
                --cSelect 'Column selection filter' \
                -q 'Display output as CSV, not as table' \
                --csvMode 'Display output as CSV, not as table' \
                -g 'Start scheduler group ID' \
                --gid 'Start scheduler group ID' \
                -u 'Display unit' \
                --unit 'Display unit'
        case pmem-stats
            printf "%s\t%s\n" \
                -v 'Describe report header labels' \
                --verbose 'Describe report header labels' \
                -s 'Column selection filter' \
                --cSelect 'Column selection filter' \
                -q 'Display output as CSV, not as table' \
                --csvMode 'Display output as CSV, not as table' \
                -l 'Levels of hierarchy to display' \
                --level 'Levels of hierarchy to display' \
                -u 'Display unit' \
                --unit 'Display unit'
    end
end

function __tally_units -a report
    switch $report
        case group-stats
            printf "%s\t%s\n" \
                mb '' \
                kb '' \
                pg ''
        case vm-stats
            printf "%s\t%s\n" \
                mb '' \
                kb '' \
                pg ''
        case uw-stats
            printf "%s\t%s\n" \
                mb '' \
                kb '' \
                pg ''
        case pshare-stats
            printf "%s\t%s\n" \
                mb '' \
                kb '' \
                pg ''
        case pshareHint-stats
            printf "%s\t%s\n" \
                mb '' \
                kb '' \
                pg ''
        case swap-stats
            printf "%s\t%s\n" \
                mb '' \
                kb '' \
                pg ''
        case comp-stats
            printf "%s\t%s\n" \
                mb '' \
                kb '' \
                pg ''
        case heap-stats
            printf "%s\t%s\n" \
                mb '' \
                kb '' \
                pg '' \
                b ''
        case guest-stats
            printf "%s\t%s\n" \
                mb '' \
                kb '' \
                pg ''
        case zip-stats
            printf "%s\t%s\n" \
                mb '' \
                kb '' \
                pg ''
        case lpage-stats
            printf "%s\t%s\n" \
                mb '' \
                kb '' \
                pg ''
        case asyncremap-stats
            printf "%s\t%s\n" \
                mb '' \
                kb '' \
                pg ''
        case pmem-stats
            printf "%s\t%s\n" \
                mb '' \
                kb '' \
                pg ''
    end
end

function __tally_flags -a report
    switch $report
        case group-stats
            printf "%s\t%s\n" \
                pre 'Predefined group' \
                lf 'Leaf group' \
                vm 'VM' \
                uw 'User world' \
                sys 'System world' \
                tw 'Test world' \
                pr 'Protected group' \
                sd 'Self-destruct group' \
                np 'Non-presistent group' \
                ke 'Kernel memory group' \
                ug 'User created group' \
                co 'Container group' \
                sc 'Sub-container group' \
                vmm 'VMM Sub-container group' \
                usr 'UW Sub-container group'
        case uw-stats
            printf "%s\t%s\n" \
                uw 'Stand-alone UW' \
                vm 'VM-based UW'
    end
end

function __tally_columns -a report
    switch $report
        case group-stats
            printf "%s\t%s\n" \
                gid 'Group ID' \
                name 'Group name' \
                parGid 'Parent group ID' \
                nChild 'Number of child groups' \
                min 'Configured memory reservation' \
                max 'Configured memory limit' \
                minLimit 'Configured memory reservation limit' \
                shares 'Configured shares' \
                conResv 'Total memory reservation consumed by children' \
                availResv 'Total memory reservation available to group' \
                memSize 'Guest physical / Accounted UW virtual / kernel machine address space currently consumed' \
                memSizePeak 'Peak guest physical / Accounted UW virtual / kernel machine address space currently consumed (since last reset)' \
                iMin 'Implicit memory reservation' \
                eMin 'Effective memory reservation' \
                eMinPeak 'Peak value for effective memory reservation (since last reset)' \
                rMinPeak 'Peak value for requested memory reservation (since last reset)' \
                bMin 'Base memory reservation' \
                bMax 'Base memory limit' \
                bShares 'Base shares' \
                fShares 'flattened base shares' \
                ovhdResv 'Reserved overhead memory' \
                ovhd 'Consumed overhead memory' \
                allocTgt 'Memory allocation target for group' \
                consumed 'Total memory consumed by group' \
                consumedPeak 'Peak value for total memory consumed by group (since last reset)' \
                touched 'Estimate of guest memory touched' \
                bActive 'Base activeness' \
                sharedSaved 'Estimate of memory savings from page sharing' \
                mps 'Memory per share (KB)' \
                throttlePct '% of possible time the guest is allowed to be executed' \
                flags 'Group flags' \
                tag 'Group Tag'
        case vm-stats
            printf "%s\t%s\n" \
                name 'Virtual machine name' \
                b 'Is balloon driver active?' \
                schedGrp 'Scheduler group ID' \
                parSchedGroup 'Parent scheduler group ID' \
                worldGrp 'World group ID' \
                memSizeLimit 'Upper bound on guest physical memory size' \
                memSize 'Guest physical memory size' \
                min 'Configured host physical memory reservation for guest' \
                max 'Configured host physical memory limit for guest' \
                minLimit 'Configured upper bound for VM reservation (includes ovhdResv)' \
                shares 'Configured shares' \
                ovhdResv 'Reserved overhead memory' \
                ovhd 'Consumed overhead memory' \
                allocTgt 'Host physical memory allocation target' \
                consumed 'Host physical memory consumed by guest' \
                balloonTgt 'Target balloon size' \
                ballooned 'Actual balloon size' \
                swapTgt 'Host swap target' \
                swapped 'Amount swapped by host' \
                mapped 'Guest physical memory backed by host memory' \
                touched 'Guest physical memory actively used by VM' \
                zipped 'Guest physical memory that is compressed' \
                vpmemRO 'Guest physical persistent memory that is cached read-only' \
                vpmemRW 'Guest physical persistent memory that is cached read-write' \
                vpmemUC 'Guest physical persistent memory that is not yet cached' \
                zipSaved 'Host physical memory saved by compression' \
                shared 'Subset of mapped that is marked COW as a result of page-sharing' \
                zero 'Subset of shared pages that are zero-filled' \
                sharedSaved 'Host physical memory saved as a result of page-sharing' \
                useReliableMem 'Uses Reliable memory' \
                swapScope 'Swap scope'
        case uw-stats
            printf "%s\t%s\n" \
                type 'Type of user-world (uw: stand-alone, vm: VM-based)' \
                name 'User world name' \
                schedGrp 'Scheduler group ID' \
                parSchedGroup 'Parent scheduler group ID' \
                worldGrp 'World group ID' \
                min 'Configured memory reservation' \
                max 'Configured memory limit' \
                minLimit 'Configured memory reservation limit' \
                shares 'Configured memory shares' \
                totalResv 'Total memory reservation' \
                pinnedResv 'Memory reserved for pinning purposes' \
                memSizeLimit 'Limit on virtual address-space size' \
                memSize 'Current virtual address-space size' \
                memBStore 'Memory backing store consumed' \
                swapBStore 'Swap backing store consumed' \
                mapped 'Virtual address-space size backed by physical memory (private + shared + pinned)' \
                touched 'Virtual memory touched used by VM' \
                swappable 'Non-shared mapped memory that can be reclaimed' \
                cow 'COW memory' \
                pageable 'Accounted pageable memory' \
                pageableUnacct 'Unaccounted pageable memory' \
                pinned 'Non-swappable mapped memory' \
                prealloced 'Preallocated memory' \
                shm 'SHM memory' \
                allocTgt 'Physical memory allocation target' \
                consumed 'Physical memory consumed' \
                swapTgt 'Swap target' \
                swapped 'Memory swapped to secondary storage' \
                useReliableMem 'Uses Reliable memory' \
                swapScope 'Swap scope'
        case buddy-stats
            printf "%s\t%s\n" \
                name 'Name of the buddy' \
                memNode 'Memory node the buddy belongs to' \
                type 'Legacy memory type name' \
                numaNode 'NUMA node the buddy belongs to' \
                4KBfree 'free 4KB buffers' \
                8KBfree 'free 8KB buffers' \
                16KBfree 'free 16KB buffers' \
                32KBfree 'free 32KB buffers' \
                64KBfree 'free 64KB buffers' \
                128KBfree 'free 128 KB buffers' \
                256KBfree 'free 256 KB buffers' \
                512KBfree 'free 512 KB buffers' \
                1MBfree 'free 1MB buffers' \
                2MBfree 'free 2MB buffers' \
                4MBfree 'free 4MB buffers' \
                8MBfree 'free 8MB buffers' \
                16MBfree 'free 16MB buffers' \
                32MBfree 'free 32MB buffers' \
                64MBfree 'free 64MB buffers' \
                128MBfree 'free 128MB buffers' \
                256MBfree 'free 256MB buffers' \
                512MBfree 'free 256MB buffers' \
                1GBfree 'free 1GB buffers' \
                4KBused 'used 4KB buffers' \
                8KBused 'used 8KB buffers' \
                16KBused 'used 16KB buffers' \
                32KBused 'used 32KB buffers' \
                64KBused 'used 64KB buffers' \
                128KBused 'used 128 KB buffers' \
                256KBused 'used 256 KB buffers' \
                512KBused 'used 512 KB buffers' \
                1MBused 'used 1MB buffers' \
                2MBused 'used 2MB buffers' \
                4MBused 'used 4MB buffers' \
                8MBused 'used 8MB buffers' \
                16MBused 'used 16MB buffers' \
                32MBused 'used 32MB buffers' \
                64MBused 'used 64MB buffers' \
                128MBused 'used 128MB buffers' \
                256MBused 'used 256MB buffers' \
                512MBused 'used 512MB buffers' \
                1GBused 'used 1GB buffers'
        case pshare-stats
            printf "%s\t%s\n" \
                cow 'Client memory marked copy-on-write' \
                cow1 'Client\'s COWed memory with single ref' \
                zero 'Zeroed client memory' \
                used 'Machine memory used for backing COWed client memory' \
                reclaimed 'Machine memory reclaimed via pshare' \
                totAdd 'Total client memory added to pshare table' \
                totRemove 'Total client memory removed from pshare table'
        case pshareHint-stats
            printf "%s\t%s\n" \
                type 'Hint type (regular or large page hint)' \
                totAdd 'Total hints added' \
                totRemove 'Total hints removed' \
                active 'Currently active hints'
        case swap-stats
            printf "%s\t%s\n" \
                name 'Virtual machine name' \
                schedGrp 'Scheduler group ID' \
                parSchedGroup 'Parent scheduler group ID' \
                worldGrp 'World group ID' \
                isSwapping 'is the VM currently swapping out' \
                CurSwapper 'knv or vmm swapper currently active' \
                cacheUsage 'Swap slot cache usage' \
                swapoutReady 'Ready-time spent by swap-out client' \
                swapTgt 'Host swap target' \
                swapped 'Amount swapped by host' \
                swapRead 'Total guest phsyical memory read, and not released, from swap space' \
                swapIn 'Total guest phsyical memory swapped in, and released, from swap space' \
                swapOut 'Total guest physical memory swapped out to swap space' \
                discarded 'Total swapped memory discarded from swap space' \
                COWSwapper 'Total guest physical memory swapped out which was marked as COW by Kernova' \
                vmmSwapOn 'Number of times vmm swapper was turned on' \
                knvSwapOn 'Number of times knv swapper was turned on' \
                llswapped 'Memory swapped to llswap' \
                llswapUsed 'Total space used in llswap including internal fragmentation' \
                totalReg 'Total space in the regular swap file' \
                freeReg 'Free space in the regular swap file' \
                cptTgt 'Total checkpoint memory to read' \
                cptRead 'Checkpoint memory read from checkpoint file' \
                cptWritten 'Checkpoint memory written to checkpoint file' \
                totalMig 'Total space in the migration swap file' \
                freeMig 'Free space in the migration swap file' \
                gblSwapRead 'Guest physical memory read from global swap file' \
                gblSwapIn 'Guest physical memory swapped in from global swap file' \
                gblSwapOut 'Guest physical memory swapped out to global swap file'
        case comp-stats
            printf "%s\t%s\n" \
                total 'Total physical memory on host' \
                discarded 'Discarded by kernova' \
                managedByMemMap 'Memory managed by MemMap' \
                reliableMem 'Reliable memory' \
                kernelCode 'Kernova code region' \
                critical 'Critical space' \
                dataAndHeap 'Kernova data and heap' \
                buddyOvhd 'Memmap buddy overhead' \
                rsvdLow 'Reserved low memory' \
                managedByMemSched 'Memory managed by MemSched' \
                minFree 'Min Free' \
                knvClientConsumed 'Consumed by kernova clients' \
                otherConsumed 'Consumed by non-kernova clients' \
                free 'Available (Free) physical memory' \
                numHigh 'Num times host in high state' \
                numClear 'Num times host in clear state' \
                numSoft 'Num times host in soft state' \
                numHard 'Num of times host in hard state' \
                numLow 'Num of times host in low state' \
                memState 'Current memory state'
        case lpool-stats
            printf "%s\t%s\n" \
                name 'Large page pool name' \
                nodeID 'Home memory node the pool' \
                nrLPages '# of large pages in the pool' \
                nrFreeSPages '# of small pages free' \
                nrSPageAllocs 'Total small page alloc count' \
                nrSPageFrees 'Total small page free count' \
                nrReapAttempts 'Total reap attemts' \
                nrSPagesReaped 'Total number of small pages reaped' \
                nrDefragAttempts 'Total large page defrag attempts' \
                nrDefragCancelled 'Total defrag attempts cancelled' \
                nrDefragReaped 'Total defrag attempts reaped' \
                nrLPagesDefragged 'Total number of large pages defragged' \
                peakDefragAttempts 'Peak defrag attempts for any large page' \
                nrCachehit 'Hit count in lpage victim cache'
        case heap-stats
            printf "%s\t%s\n" \
                name 'heap name' \
                dynGrow 'dynamically growable' \
                lowerLimit 'lower limit' \
                upperLimit 'upper limit' \
                reserved 'reserved' \
                numRanges 'num ranges' \
                dlMallocOvdh 'DL malloc overhead' \
                used 'current used' \
                avail 'current available' \
                size 'current size' \
                initial 'initial size' \
                max 'max size' \
                pctFreeOfCur '% free of current' \
                maxAvail 'max available' \
                pctFreeOfMax '% free of max' \
                lowPctFreeOfMax 'lowest % free of max' \
                numSuccAllocs 'number of succeeded allocations' \
                numFailAllocs 'number of succeeded allocations' \
                numGrowthOps 'number of growth operations' \
                numShrinkOps 'number of shrink operations' \
                numReqsPerGrowth 'number of requests per growth operations' \
                avgAllocSize 'average allocation size'
        case guest-stats
            printf "%s\t%s\n" \
                name 'Virtual machine name' \
                schedGrp 'Scheduler group ID' \
                parSchedGroup 'Parent scheduler group ID' \
                worldGrp 'World group ID' \
                memTotal 'Total memory' \
                lpageTotal 'Total large pages available for guest apps' \
                memNeeded 'Memory required by current workload'
        case zip-stats
            printf "%s\t%s\n" \
                name 'Virtual machine name' \
                schedGrp 'Scheduler group ID' \
                parSchedGroup 'Parent scheduler group ID' \
                worldGrp 'World group ID' \
                totalCache 'Total compression cache configured' \
                maxCache 'Maximum compression cache' \
                usedCache 'Total compression cache used' \
                zipped 'Total memory compressed' \
                unZipped 'Total memory decompressed' \
                zipRejected 'Total memory rejected' \
                nrFreeHalf 'Total free half pages' \
                nrFreeQuarter 'Total free quarter pages' \
                avgZipTime 'Average compression time in usec' \
                avgUnzipTime 'Average decompression time in usec'
        case lpage-stats
            printf "%s\t%s\n" \
                name 'Virtual machine name' \
                schedGrp 'Scheduler group ID' \
                parSchedGroup 'Parent scheduler group ID' \
                worldGrp 'World group ID' \
                nrBackings 'Current number of lpage backings' \
                nrAllocSuccess 'Number of lpage mapping attempts succeeded' \
                nrLocked 'Number of guest lpage mappings created' \
                nrBroken 'Number of guest lpage mappings broken' \
                maxSwapThreshold 'Current max swap-in threshold to map lpage' \
                nrFailPinned 'Number of lpage mapping attempts failed due to pinning' \
                nrFailSwapped 'Number of lpage mapping attempts failed to avoid excessive swapins' \
                nrFailPinnedLate 'Number of lpage mapping attempts failed due to late pinning' \
                nrFailNoMem 'Number of lpage mapping attempts failed due to lack of memory'
        case asyncremap-stats
            printf "%s\t%s\n" \
                name 'Group name' \
                grpLeader 'Group leader ID' \
                type 'Type of remap' \
                added 'Total number of pages ever added' \
                prepared 'Number of pages ever prepared' \
                filtered 'Number of pages ever filtered' \
                staged 'Number of pages ever staged' \
                remapped 'Total number of pages ever remapped' \
                canceled 'Total number of pages ever canceled' \
                cUnprepared 'Number of pages currently unprepared' \
                cPrepared 'Number of pages currently prepared' \
                cStaged 'Number of pages currently staged'
        case pmem-stats
            printf "%s\t%s\n" \
                uuid 'Volume UUID' \
                alloc2MBlocks 'Allocated 2M Blocks' \
                resvd2MBlocks 'Reserved 2M Blocks' \
                avail2MBlocks 'Available Reservable 2M Blocks' \
                totalRegions 'Total regions in the region store' \
                freeRegions 'Free regions in the region store' \
                total2MBlocks 'Total 2M Blocks' \
                isClean 'Is region store clean ?' \
                regionUuid 'Region UUID' \
                size 'Region memory size' \
                reserved 'Reserved 2M blocks' \
                flags 'Flags'
    end
end
# END

# The report on the command line, if it is there.
function __tally_report
    set -l words (commandline -opc)
    set -e words[1]
    while set -q words[1]
        set -l value
        switch $words[1]
            case -r --report
                set value $words[2]
                set -e words[1]
            case '-r*'
                set value (string sub -s 3 -- $words[1])
            case '--report=*'
                set value (string replace -- --report= '' $words[1])
            case -c --cache -f
                set -e words[1]
        end
        set -e words[1]
        for report in (__tally_reports | string split -f 1 \t)
            if test (string lower -- $report) = (string lower -- "$value")
                echo $report
                return 0
            end
        end
    end
    return 1
end

function __tally_takes -a option
    set -l report (__tally_report); or return
    __tally_options $report | string match -q -- "$option"\t'*'
end

# Each list of words joined by ':' that has one of the words more than the one being typed.
function __tally_lists
    set -l typed (commandline -ct | string replace -r -- '^(--[a-zA-Z]+=|-[ies])' '')
    set -l head (string match -r -- '.*:' "$typed")
    set -l used (string split : -- (string lower -- "$head"))
    while read -l line
        contains -- (string lower -- (string split -f 1 \t -- $line)) $used; or echo "$head$line"
    end
end

complete -c tally -f
complete -c tally -n 'not __tally_report' -s r -l report -x -a '(__tally_reports)' -d 'Print this report'
complete -c tally -n 'not __tally_report' -s c -l cache -r -F -d 'Read a cache file instead of the host'
complete -c tally -n 'not __tally_report' -s f -x -d 'Go on if the version check fails; ignores a word'
complete -c tally -n 'not __tally_report' -l force -d 'Go on if the version check fails'
complete -c tally -n 'not __tally_report' -s h -l help -d 'Print a summary'

complete -c tally -n '__tally_takes -v' -s v -d 'Describe report header labels'
complete -c tally -n '__tally_takes --verbose' -l verbose -d 'Describe report header labels'
complete -c tally -n '__tally_takes -q' -s q -l csvMode -d 'Display output as CSV, not as table'
complete -c tally -n '__tally_takes -s' -s s -l cSelect -x -a '(__tally_columns (__tally_report) | __tally_lists)' -d 'Column selection filter'
complete -c tally -n '__tally_takes -g' -s g -l gid -x -d 'Start scheduler group ID'
complete -c tally -n '__tally_takes -l' -s l -l level -x -d 'Levels of hierarchy to display'
complete -c tally -n '__tally_takes -u' -s u -l unit -x -a '(__tally_units (__tally_report))' -d 'Display unit'
complete -c tally -n '__tally_takes -i' -s i -l iFilter -x -a '(__tally_flags (__tally_report) | __tally_lists)' -d 'Inclusion filter'
complete -c tally -n '__tally_takes -e' -s e -l eFilter -x -a '(__tally_flags (__tally_report) | __tally_lists)' -d 'Exclusion filter'
complete -c tally -n '__tally_takes -t' -s t -l tags -d 'Display a tag summary'
