-- Which ten machines of the fleet grew most since yesterday, in KB? Of each host it is the last moment
-- and the one nearest to a day before that; a machine that has come since grew by all it has.
SELECT host, name,
       maxIf(consumed, time = last) -
           if(min(time) = last, 0, maxIf(consumed, time = first)) AS grown
FROM vm_stats_all
GLOBAL ANY INNER JOIN
(
    SELECT host, last, argMin(time, abs(toInt64(last) - 86400 - toInt64(time))) AS first
    FROM moments_all
    GLOBAL ANY INNER JOIN (SELECT host, max(time) AS last FROM moments_all GROUP BY host)
    USING host
    WHERE time < last
    GROUP BY host, last
)
USING host
WHERE time = first OR time = last
GROUP BY host, name, last
HAVING max(time) = last
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

-- Which heaps grew on all hosts of a kernel, of those with two moments?
SELECT name, built
FROM
(
    SELECT host, name, argMax(used, time) > argMin(used, time) AS grew
    FROM heap_stats_all
    GROUP BY host, name
    HAVING max(time) > min(time)
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
