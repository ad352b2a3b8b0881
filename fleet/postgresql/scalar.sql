-- A scalar over the fleet, in numbers of any length: exact until the last step.
WITH device_values AS (
    SELECT device, CASE WHEN device = '' THEN report_id END AS unnamed, count(*) AS n, sum(value) AS total,
           sum(value) * 1.000000000000000000000000000000000000 / count(*) AS mean, var_pop(value) AS variance,
           min(value) AS minimum, max(value) AS maximum
    FROM scalars
    WHERE key = {{key}} AND md5(key)::uuid = md5({{key}})::uuid AND day BETWEEN {{first}} AND {{last}}
    GROUP BY device, unnamed
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
