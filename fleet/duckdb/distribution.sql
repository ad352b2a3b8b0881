-- A distribution over the fleet: count, mean and squared deviations of all reports merged, deviations in a second pass over the
-- reports. All is reckoned from a mean that one of them has (origin), so that a large offset takes no digits away.
WITH chosen AS MATERIALIZED (
    SELECT report_id, coalesce(min(device) FILTER (device <> ''), '') AS named, if(named = '', report_id, '') AS unnamed,
           any_value(count) AS n, any_value(minimum) AS minimum, any_value(maximum) AS maximum, any_value(mean) AS center,
           greatest(any_value(m2), 0) AS deviations, any_value(finite) AS finite,
           any_value(reports) AS reports, any_value(mean_rest) AS rest
    FROM distribution_states WHERE key = {{key}} AND day BETWEEN {{first}} AND {{last}} GROUP BY report_id
), finite_ones AS (
    SELECT *, n::DOUBLE AS weight, center - min(center) OVER () + rest AS shift, min(center) OVER () AS origin
    FROM chosen WHERE finite = 1 AND n > 0
), device_sums AS (
    SELECT fsum(weight) AS weight, fsum(weight * shift) AS sum FROM finite_ones GROUP BY named, unnamed
), means AS (
    SELECT fsum(sum) / fsum(weight) AS all_shift, fsum(sum / weight) / count(*) AS vote_shift
    FROM device_sums HAVING count(*) >= {{devices}}::BIGINT
), devices AS (
    SELECT sum(reports) AS reports, sum(n) AS count, fsum(weight) AS weight, min(minimum) AS minimum, max(maximum) AS maximum,
           any_value(origin + all_shift) AS mean, any_value(origin + vote_shift) AS device_mean,
           fsum(deviations + weight * (shift - all_shift) ** 2) AS squares,
           fsum(deviations + weight * (shift - vote_shift) ** 2) AS vote_squares
    FROM finite_ones CROSS JOIN means GROUP BY named, unnamed
)
SELECT count(*) AS devices, sum(reports) AS reports, sum(count) AS count, any_value(mean) AS mean,
       sqrt(fsum(squares) / fsum(weight)) AS stddev, min(minimum) AS minimum, max(maximum) AS maximum,
       any_value(device_mean) AS device_mean, sqrt(fsum(vote_squares / weight) / count(*)) AS device_stddev,
       (SELECT count(*) FROM chosen WHERE finite = 0) AS left_out
FROM devices
HAVING count(*) > 0
