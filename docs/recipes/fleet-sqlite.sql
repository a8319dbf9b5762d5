.mode tabs
-- Which ten machines of the fleet grew most since yesterday, in KB? Of each host it is the last moment
-- and the one nearest to a day before that; a machine that has come since grew by all it has.
-- A column beside max(time) or min(...) is of that row.
CREATE TEMP TABLE days (host PRIMARY KEY, first, last);
INSERT INTO days
SELECT host, first, last
FROM (SELECT host, last, time AS first, min(abs(julianday(last) - 1 - julianday(time)))
      FROM moments JOIN (SELECT host, max(time) AS last FROM moments GROUP BY host) USING (host)
      WHERE time < last
      GROUP BY host);
SELECT host, name,
       max(CASE time WHEN last THEN consumed END) -
           CASE min(time) WHEN last THEN 0 ELSE max(CASE time WHEN first THEN consumed END) END AS grown
FROM vm_stats JOIN days USING (host)
WHERE time IN (first, last)
GROUP BY host, name
HAVING max(time) = last
ORDER BY grown DESC
LIMIT 10;

-- Which hosts have less free memory than their minimum?
SELECT host
FROM (SELECT host, max(time), free < minFree AS isBelow FROM comp_stats GROUP BY host)
WHERE isBelow
ORDER BY host;

-- Which heaps grew on all hosts of a kernel, of those with two moments?
SELECT name, built
FROM (SELECT host, name, max(time) AS until, used AS last FROM heap_stats GROUP BY host, name)
JOIN (SELECT host, name, min(time) AS since, used AS first FROM heap_stats GROUP BY host, name)
USING (host, name)
JOIN (SELECT host, max(time), built FROM moments GROUP BY host)
USING (host)
WHERE until > since
GROUP BY name, built
HAVING min(last > first)
ORDER BY name, built;
