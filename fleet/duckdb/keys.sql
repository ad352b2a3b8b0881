-- The keys that begin with a prefix, by how many devices report them.
WITH entries AS (
    SELECT 'scalar' AS kind, key, device, report_id, reports FROM scalar_states
    WHERE starts_with(key, {{prefix}}) AND day BETWEEN {{first}} AND {{last}}
    UNION ALL
    SELECT 'distribution', key, device, report_id, reports FROM distribution_states
    WHERE starts_with(key, {{prefix}}) AND day BETWEEN {{first}} AND {{last}}
), chosen AS (
    SELECT kind, key, report_id, coalesce(min(device) FILTER (device <> ''), '') AS named, if(named = '', report_id, '') AS unnamed,
           any_value(reports) AS reports
    FROM entries GROUP BY kind, key, report_id
)
SELECT kind, key, count(DISTINCT (named, unnamed)) AS devices, sum(reports) AS reports
FROM chosen
GROUP BY kind, key
HAVING count(DISTINCT (named, unnamed)) >= {{devices}}::BIGINT
ORDER BY devices DESC, key, kind
