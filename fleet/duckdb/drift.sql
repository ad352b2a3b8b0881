-- Each week of a key beside the week before it, where both have devices enough: the mean of the devices' own means, and how far it
-- moved. Weeks begin on Mondays; those that the range cuts are cut. Reckoned in doubles.
WITH entries AS (
    SELECT 'scalar' AS kind, day, device, report_id, reports AS n, total::DOUBLE / reports AS center FROM scalar_states
    WHERE key = {{key}} AND day BETWEEN {{first}} AND {{last}}
    UNION ALL
    SELECT 'distribution', day, device, report_id, count, mean FROM distribution_states
    WHERE key = {{key}} AND day BETWEEN {{first}} AND {{last}} AND finite = 1 AND count > 0
), chosen AS (
    SELECT kind, report_id, date_trunc('week', any_value(day))::DATE AS week, any_value(n)::DOUBLE AS n, any_value(center) AS center,
           coalesce(min(device) FILTER (device <> ''), '') AS named, if(named = '', report_id, '') AS unnamed
    FROM entries WHERE day BETWEEN '1970-01-05' AND '2105-12-31' GROUP BY kind, report_id
), device_weeks AS (
    SELECT kind, week, fsum(n * center) / fsum(n) AS mean FROM chosen GROUP BY kind, week, named, unnamed
), weeks AS (
    SELECT kind, week, count(*) AS devices, fsum(mean) / count(*) AS device_mean
    FROM device_weeks GROUP BY kind, week HAVING count(*) >= {{devices}}::BIGINT
)
SELECT kind, now.week, now.devices, before.devices AS devices_before, now.device_mean, before.device_mean AS device_mean_before,
       now.device_mean - before.device_mean AS change
FROM weeks AS now JOIN weeks AS before USING (kind)
WHERE now.week - before.week = 7
ORDER BY kind, now.week
