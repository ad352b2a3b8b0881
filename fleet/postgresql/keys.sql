-- The keys that begin with a prefix, by how many devices report them.
SELECT kind, key, count(DISTINCT (device, CASE WHEN device = '' THEN report_id END)) AS devices, count(*) AS reports
FROM (
    SELECT 'scalar' AS kind, key, device, report_id FROM scalars
    WHERE starts_with(key, {{prefix}}) AND day BETWEEN {{first}} AND {{last}}
    UNION ALL
    SELECT 'distribution', key, device, report_id FROM distributions
    WHERE starts_with(key, {{prefix}}) AND day BETWEEN {{first}} AND {{last}}
) AS entries
GROUP BY kind, key
HAVING count(DISTINCT (device, CASE WHEN device = '' THEN report_id END)) >= {{devices}}
ORDER BY devices DESC, key COLLATE "C", kind
