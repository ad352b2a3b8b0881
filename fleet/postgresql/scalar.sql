-- A scalar over the fleet, in numbers of any length: exact until the last step, whichever way the squares are taken.
WITH device_sums AS (
    SELECT device, CASE WHEN device = '' THEN report_id END AS unnamed, sum(reports) AS n, sum(total) AS total,
           sum(m2 + total * total * 1.000000000000000000000000000000000000 / reports) AS squares,
           min(minimum) AS minimum, max(maximum) AS maximum
    FROM scalar_states
    WHERE key = {{key}} AND md5(key)::uuid = md5({{key}})::uuid AND day BETWEEN {{first}} AND {{last}}
    GROUP BY device, unnamed
), device_values AS (
    SELECT n, total, total * 1.000000000000000000000000000000000000 / n AS mean, minimum, maximum,
           greatest(squares - total * total * 1.000000000000000000000000000000000000 / n, 0) / n AS variance
    FROM device_sums
), fleet AS (
    SELECT sum(total) * 1.000000000000000000000000000000000000 / sum(n) AS mean, avg(mean) AS device_mean FROM device_values
)
SELECT
    count(*) AS devices,
    sum(n)::bigint AS reports,
    fleet.mean::double precision AS mean,
    sqrt(sum(n * (variance + (v.mean - fleet.mean) ^ 2)) / sum(n))::double precision AS stddev,
    min(minimum) AS minimum,
    max(maximum) AS maximum,
    fleet.device_mean::double precision AS device_mean,
    sqrt(avg(variance + (v.mean - fleet.device_mean) ^ 2))::double precision AS device_stddev
FROM device_values v CROSS JOIN fleet
GROUP BY fleet.mean, fleet.device_mean
HAVING count(*) >= {{devices}}
