-- Each week of a key beside the week before it, where both have devices enough: the mean of the devices' own means, and how far it
-- moved. Weeks begin on Mondays; those that the range cuts are cut. Reckoned in doubles.
WITH entries AS (
    SELECT 'scalar' AS kind, day, device, report_id, reports AS n, (total / reports)::double precision AS center FROM scalar_states
    WHERE key = {{key}} AND md5(key)::uuid = md5({{key}})::uuid AND day BETWEEN {{first}} AND {{last}}
    UNION ALL
    SELECT 'distribution', day, device, report_id, count, mean FROM distribution_states
    WHERE key = {{key}} AND md5(key)::uuid = md5({{key}})::uuid AND day BETWEEN {{first}} AND {{last}} AND finite = 1 AND count > 0
), device_weeks AS (
    SELECT kind, date_trunc('week', day)::date AS week, float8_avg(fleet_merged(ARRAY[n, n * center, 0])) AS mean
    FROM entries WHERE day BETWEEN '1970-01-05' AND '2105-12-31'
    GROUP BY kind, week, device, CASE WHEN device = '' THEN report_id END
), weeks AS (
    SELECT kind, week, count(*) AS devices, avg(mean) AS device_mean FROM device_weeks GROUP BY kind, week HAVING count(*) >= {{devices}}
)
SELECT kind, now.week, now.devices, before.devices AS devices_before, now.device_mean, before.device_mean AS device_mean_before,
       now.device_mean - before.device_mean AS change
FROM weeks now JOIN weeks before USING (kind)
WHERE now.week - before.week = 7
ORDER BY kind, week
