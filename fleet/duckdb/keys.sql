-- The keys that begin with a prefix, by how many devices report them.
WITH entries AS (
    SELECT 'scalar' AS kind, key, device, report_id FROM scalars
    WHERE starts_with(key, {{prefix}}) AND day BETWEEN {{first}} AND {{last}}
    UNION ALL
    SELECT 'distribution', key, device, report_id FROM distributions
    WHERE starts_with(key, {{prefix}}) AND day BETWEEN {{first}} AND {{last}}
), chosen AS (
    SELECT kind, key, report_id, coalesce(min(device) FILTER (device <> ''), '') AS named, if(named = '', report_id, '') AS unnamed
    FROM entries GROUP BY kind, key, report_id
)
SELECT kind, key, count(DISTINCT (named, unnamed)) AS devices, count(*) AS reports
FROM chosen
GROUP BY kind, key
HAVING count(DISTINCT (named, unnamed)) >= {{devices}}::BIGINT
ORDER BY devices DESC, key, kind
