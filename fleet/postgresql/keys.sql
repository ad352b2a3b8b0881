-- The keys that begin with a prefix, by how many devices report them.
SELECT kind, key, count(DISTINCT (device, CASE WHEN device = '' THEN report_id END)) AS devices, sum(reports)::bigint AS reports
FROM (
    SELECT 'scalar' AS kind, key, device, report_id, reports FROM scalar_states
    WHERE starts_with(key, {{prefix}}) AND day BETWEEN {{first}} AND {{last}}
    UNION ALL
    SELECT 'distribution', key, device, report_id, reports FROM distribution_states
    WHERE starts_with(key, {{prefix}}) AND day BETWEEN {{first}} AND {{last}}
) AS entries
GROUP BY kind, key
HAVING count(DISTINCT (device, CASE WHEN device = '' THEN report_id END)) >= {{devices}}
ORDER BY devices DESC, key COLLATE "C", kind
