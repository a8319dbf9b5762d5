-- Which ten machines of the fleet grew most since yesterday, in KB?
SELECT host, name, last - first AS grown
FROM
(
    SELECT host, name, schedGrp, argMin(consumed, time) AS first, argMax(consumed, time) AS last
    FROM vm_stats_all
    WHERE time >= (SELECT max(time) - 86400 FROM vm_stats_all)
    GROUP BY host, name, schedGrp
)
ORDER BY grown DESC
LIMIT 10
FORMAT TabSeparated;

-- Which hosts have less free memory than their minimum?
SELECT host
FROM comp_stats_all
GROUP BY host
HAVING argMax(free, time) < argMax(minFree, time)
ORDER BY host
FORMAT TabSeparated;

-- Which heaps grew on all hosts of a kernel?
SELECT name, built
FROM
(
    SELECT host, name, argMax(used, time) > argMin(used, time) AS grew
    FROM heap_stats_all
    GROUP BY host, name
)
ANY INNER JOIN
(
    SELECT host, argMax(built, time) AS built FROM moments_all GROUP BY host
)
USING host
GROUP BY name, built
HAVING min(grew) = 1
ORDER BY name, built
FORMAT TabSeparated;
