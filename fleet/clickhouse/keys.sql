-- The keys that begin with a prefix, by how many devices report them.
SELECT kind, metric AS key, uniqExact(named, unnamed) AS devices, sum(row_reports) AS reports
FROM (
    SELECT 'scalar' AS kind, metric, named, unnamed, row_reports
    FROM (
        SELECT report_id, key AS metric, minIf(device, device != '') AS named, if(named = '', report_id, '') AS unnamed,
               any(reports) AS row_reports
        FROM scalars WHERE key >= {{prefix}} AND startsWith(key, {{prefix}}) AND day >= {{first}} AND day <= {{last}}
        GROUP BY report_id, metric
    )
    UNION ALL
    SELECT 'distribution' AS kind, metric, named, unnamed, row_reports
    FROM (
        SELECT report_id, key AS metric, minIf(device, device != '') AS named, if(named = '', report_id, '') AS unnamed,
               any(reports) AS row_reports
        FROM distributions WHERE key >= {{prefix}} AND startsWith(key, {{prefix}}) AND day >= {{first}} AND day <= {{last}}
        GROUP BY report_id, metric
    )
)
GROUP BY kind, metric
HAVING devices >= toInt64({{devices}})
ORDER BY devices DESC, metric, kind
SETTINGS skip_unavailable_shards = 0
