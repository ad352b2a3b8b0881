-- Each week of a key beside the week before it, where both have devices enough: the mean of the devices' own means, and how far it
-- moved. Weeks begin on Mondays; those that the range cuts are cut. Reckoned in doubles, for days that a Date of any version has.
SELECT
    kind, toString(now.1) AS week, now.2 AS devices, before.2 AS devices_before,
    now.3 AS device_mean, before.3 AS device_mean_before, now.3 - before.3 AS change
FROM (
    SELECT kind, weeks[place] AS now, weeks[place - 1] AS before
    FROM (
        SELECT kind, weeks, arrayJoin(arrayEnumerate(weeks)) AS place
        FROM (
            SELECT kind, arraySort(groupArray((monday, all_devices, vote_mean))) AS weeks
            FROM (
                SELECT kind, monday, count() AS all_devices, sumKahan(total / weight) / count() AS vote_mean
                FROM (
                    SELECT kind, monday, named, unnamed, sumKahan(n * center) AS total, sumKahan(n) AS weight
                    FROM (
                        SELECT 'scalar' AS kind, report_id, toMonday(toDate(any(day))) AS monday, toFloat64(any(reports)) AS n,
                               toFloat64(any(total)) / any(reports) AS center,
                               minIf(device, device != '') AS named, if(named = '', report_id, '') AS unnamed
                        FROM scalars
                        WHERE key = {{key}} AND day >= {{first}} AND day <= {{last}} AND day >= '1970-01-05' AND day <= '2105-12-31'
                        GROUP BY report_id
                        UNION ALL
                        SELECT 'distribution' AS kind, report_id, toMonday(toDate(any(day))) AS monday, toFloat64(any(count)) AS n,
                               any(mean) AS center,
                               minIf(device, device != '') AS named, if(named = '', report_id, '') AS unnamed
                        FROM distributions
                        WHERE key = {{key}} AND day >= {{first}} AND day <= {{last}} AND day >= '1970-01-05' AND day <= '2105-12-31'
                              AND finite = 1 AND count > 0
                        GROUP BY report_id
                    )
                    GROUP BY kind, monday, named, unnamed
                )
                GROUP BY kind, monday
                HAVING all_devices >= toInt64({{devices}})
            )
            GROUP BY kind
        )
    )
    WHERE place > 1
)
WHERE now.1 - before.1 = 7
ORDER BY kind, week
SETTINGS skip_unavailable_shards = 0
