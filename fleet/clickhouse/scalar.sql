-- A scalar over the fleet. Sums are of whole numbers, 128 bits wide: doubles would lose what is beyond 2^53. A mean is kept as
-- its whole part and its fraction, and deviations from it are taken in a second pass. (Decimals are no keys of a GROUP BY here:
-- beside texts they end an 18.16.)
SELECT
    count() AS devices,
    sum(device_reports) AS reports,
    any(all_mean) AS mean,
    sqrt(sumKahan(squares) / sum(device_reports)) AS stddev,
    min(device_minimum) AS minimum,
    max(device_maximum) AS maximum,
    any(vote_mean) AS device_mean,
    sqrt(sumKahan(vote_squares / device_reports) / count()) AS device_stddev
FROM (
    SELECT
        named, unnamed,
        any(toFloat64(whole) + fraction) AS all_mean,
        any(toFloat64(vote_whole) + vote_fraction) AS vote_mean,
        sum(n) AS device_reports,
        min(low) AS device_minimum,
        max(high) AS device_maximum,
        sumKahan(deviations + n * pow(toFloat64(s / n - whole) + toFloat64(s - s / n * n) / n - fraction, 2)) AS squares,
        sumKahan(deviations + n * pow(toFloat64(s / n - vote_whole) + toFloat64(s - s / n * n) / n - vote_fraction, 2)) AS vote_squares
    FROM (
        SELECT report_id, minIf(device, device != '') AS named, if(named = '', report_id, '') AS unnamed, any(reports) AS n,
               any(total) AS s, any(minimum) AS low, any(maximum) AS high, any(m2) AS deviations
        FROM scalars WHERE key = {{key}} AND day >= {{first}} AND day <= {{last}} GROUP BY report_id
    ) AS chosen
    CROSS JOIN (
        SELECT
            all_total / all_reports AS whole,
            toFloat64(all_total - whole * all_reports) / all_reports AS fraction,
            wholes / all_devices AS vote_whole,
            (toFloat64(wholes - vote_whole * all_devices) + fractions) / all_devices AS vote_fraction
        FROM (
            SELECT
                toInt64(count()) AS all_devices,
                toInt64(sum(n)) AS all_reports,
                sum(s) AS all_total,
                sum(s / n) AS wholes,
                sumKahan(toFloat64(s - s / n * n) / n) AS fractions
            FROM (
                SELECT named, unnamed, toInt64(sum(row_reports)) AS n, sum(row_total) AS s
                FROM (
                    SELECT report_id, minIf(device, device != '') AS named, if(named = '', report_id, '') AS unnamed,
                           any(reports) AS row_reports, any(total) AS row_total
                    FROM scalars WHERE key = {{key}} AND day >= {{first}} AND day <= {{last}} GROUP BY report_id
                )
                GROUP BY named, unnamed
            )
            HAVING all_devices >= greatest(toInt64({{devices}}), 1)
        )
    ) AS means
    GROUP BY named, unnamed
)
HAVING devices > 0
SETTINGS skip_unavailable_shards = 0
