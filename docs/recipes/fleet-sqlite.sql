.mode tabs
-- Which ten machines of the fleet grew most since yesterday, in KB?
-- A column beside max(time) or min(time) is of that row.
SELECT host, name, last - first AS grown
FROM (SELECT host, name, schedGrp, max(time), consumed AS last
      FROM vm_stats GROUP BY host, name, schedGrp)
JOIN (SELECT host, name, schedGrp, min(time), consumed AS first
      FROM vm_stats
      WHERE time >= (SELECT strftime('%Y-%m-%dT%H:%M:%SZ', max(time), '-1 day') FROM vm_stats)
      GROUP BY host, name, schedGrp)
USING (host, name, schedGrp)
ORDER BY grown DESC
LIMIT 10;

-- Which hosts have less free memory than their minimum?
SELECT host
FROM (SELECT host, max(time), free < minFree AS isBelow FROM comp_stats GROUP BY host)
WHERE isBelow
ORDER BY host;

-- Which heaps grew on all hosts of a kernel?
SELECT name, built
FROM (SELECT host, name, max(time), used AS last FROM heap_stats GROUP BY host, name)
JOIN (SELECT host, name, min(time), used AS first FROM heap_stats GROUP BY host, name)
USING (host, name)
JOIN (SELECT host, max(time), built FROM moments GROUP BY host)
USING (host)
GROUP BY name, built
HAVING min(last > first)
ORDER BY name, built;
