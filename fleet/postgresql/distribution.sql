-- A distribution over the fleet: the reports' states merged into one for each device, and those into one for all. Sums are taken
-- from a mean that one of the reports has (pivot), so that a large offset takes no digits away.
WITH chosen AS (
    SELECT *, min(mean) FILTER (WHERE finite = 1 AND count > 0) OVER () AS pivot, count(*) FILTER (WHERE finite = 0) OVER () AS left_out
    FROM distribution_states
    WHERE key = {{key}} AND md5(key)::uuid = md5({{key}})::uuid AND day BETWEEN {{first}} AND {{last}}
), device_states AS (
    SELECT sum(reports) AS reports, sum(count) AS count, min(minimum) AS minimum, max(maximum) AS maximum, pivot, left_out,
           fleet_merged(ARRAY[count, count * (mean - pivot + mean_rest), greatest(m2, 0)]) AS state
    FROM chosen WHERE finite = 1 AND count > 0
    GROUP BY device, CASE WHEN device = '' THEN report_id END, pivot, left_out
), fleet AS (
    SELECT count(*) AS devices, sum(reports)::bigint AS reports, sum(count) AS count, min(minimum) AS minimum, max(maximum) AS maximum,
           pivot, left_out, fleet_merged(state) AS all_values,
           fleet_merged(ARRAY[1, float8_avg(state), float8_var_pop(state)]) AS votes
    FROM device_states GROUP BY pivot, left_out
)
SELECT devices, reports, count, pivot + float8_avg(all_values) AS mean, float8_stddev_pop(all_values) AS stddev, minimum, maximum,
       pivot + float8_avg(votes) AS device_mean, float8_stddev_pop(votes) AS device_stddev, left_out
FROM fleet
WHERE devices >= {{devices}}
