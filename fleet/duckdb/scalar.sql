-- A scalar over the fleet. Sums are of whole numbers, 128 bits wide: doubles would lose what is beyond 2^53. A mean is kept as its
-- whole part and its fraction, and deviations from it are taken in a second pass.
WITH chosen AS MATERIALIZED (
    SELECT report_id, coalesce(min(device) FILTER (device <> ''), '') AS named, if(named = '', report_id, '') AS unnamed,
           any_value(reports) AS n, any_value(total) AS s, any_value(minimum) AS minimum, any_value(maximum) AS maximum,
           any_value(m2) AS deviations
    FROM scalar_states WHERE key = {{key}} AND day BETWEEN {{first}} AND {{last}} GROUP BY report_id
), device_sums AS (
    SELECT sum(n) AS n, sum(s) AS s FROM chosen GROUP BY named, unnamed
), sums AS (
    SELECT count(*) AS devices, sum(n) AS reports, sum(s) AS total, sum(s // n) AS wholes,
           fsum((s - s // n * n)::DOUBLE / n::DOUBLE) AS fractions
    FROM device_sums HAVING count(*) >= {{devices}}::BIGINT
), means AS (
    SELECT total // reports AS whole, (total - whole * reports)::DOUBLE / reports::DOUBLE AS fraction, wholes // devices AS vote_whole,
           ((wholes - vote_whole * devices)::DOUBLE + fractions) / devices AS vote_fraction
    FROM sums
), devices AS (
    SELECT sum(n) AS n, min(minimum) AS minimum, max(maximum) AS maximum,
           any_value(whole::DOUBLE + fraction) AS mean, any_value(vote_whole::DOUBLE + vote_fraction) AS device_mean,
           fsum(deviations + n * ((s // n - whole)::DOUBLE + (s - s // n * n)::DOUBLE / n - fraction) ** 2) AS squares,
           fsum(deviations + n * ((s // n - vote_whole)::DOUBLE + (s - s // n * n)::DOUBLE / n - vote_fraction) ** 2) AS vote_squares
    FROM chosen CROSS JOIN means GROUP BY named, unnamed
)
SELECT count(*) AS devices, sum(n) AS reports, any_value(mean) AS mean, sqrt(fsum(squares) / sum(n)) AS stddev,
       min(minimum) AS minimum, max(maximum) AS maximum, any_value(device_mean) AS device_mean,
       sqrt(fsum(vote_squares / n) / count(*)) AS device_stddev
FROM devices
HAVING count(*) > 0
