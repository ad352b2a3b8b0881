-- A distribution over the fleet: count, mean and squared deviations of all reports merged, deviations in a second pass over the
-- reports. All is reckoned from a mean that one of them has (pivot), so that a large offset takes no digits away.
SELECT
    count() AS devices,
    sum(device_reports) AS reports,
    sum(device_count) AS count,
    any(pivot + all_shift) AS mean,
    sqrt(sumKahan(squares) / sumKahan(device_weight)) AS stddev,
    min(device_minimum) AS minimum,
    max(device_maximum) AS maximum,
    any(pivot + vote_shift) AS device_mean,
    sqrt(sumKahan(vote_squares / device_weight) / count()) AS device_stddev,
    any(not_finite) AS left_out
FROM (
    SELECT
        named, unnamed,
        any(report_pivot) AS pivot,
        any(report_all_shift) AS all_shift,
        any(report_vote_shift) AS vote_shift,
        any(report_not_finite) AS not_finite,
        sum(row_reports) AS device_reports,
        sum(toDecimal128(n, 0)) AS device_count,
        sumKahan(toFloat64(n)) AS device_weight,
        min(low) AS device_minimum,
        max(high) AS device_maximum,
        sumKahan(deviations + toFloat64(n) * pow(center - report_pivot + rest - report_all_shift, 2)) AS squares,
        sumKahan(deviations + toFloat64(n) * pow(center - report_pivot + rest - report_vote_shift, 2)) AS vote_squares
    FROM (
        SELECT report_id, minIf(device, device != '') AS named, if(named = '', report_id, '') AS unnamed, any(count) AS n,
               any(minimum) AS low, any(maximum) AS high, any(mean) AS center, any(mean_rest) AS rest, greatest(any(m2), 0.) AS deviations,
               any(finite) AS is_finite, any(reports) AS row_reports
        FROM distributions WHERE key = {{key}} AND day >= {{first}} AND day <= {{last}} GROUP BY report_id
        HAVING is_finite = 1 AND n > 0
    ) AS chosen
    CROSS JOIN (
        SELECT
            any(device_pivot) AS report_pivot,
            sumKahan(shift) / sumKahan(weight) AS report_all_shift,
            sumKahan(shift / weight) / count() AS report_vote_shift,
            any(device_not_finite) AS report_not_finite
        FROM (
            SELECT named, unnamed, any(first_mean) AS device_pivot, any(reports_not_finite) AS device_not_finite,
                   sumKahan(toFloat64(n)) AS weight, sumKahan(toFloat64(n) * (center - first_mean + rest)) AS shift
            FROM (
                SELECT report_id, minIf(device, device != '') AS named, if(named = '', report_id, '') AS unnamed, any(count) AS n,
                       any(mean) AS center, any(mean_rest) AS rest, any(finite) AS is_finite
                FROM distributions WHERE key = {{key}} AND day >= {{first}} AND day <= {{last}} GROUP BY report_id
                HAVING is_finite = 1 AND n > 0
            ) AS chosen
            CROSS JOIN (
                SELECT minIf(mean, finite = 1 AND count > 0) AS first_mean, uniqExactIf(report_id, finite = 0) AS reports_not_finite
                FROM distributions WHERE key = {{key}} AND day >= {{first}} AND day <= {{last}}
            ) AS start
            GROUP BY named, unnamed
        )
        HAVING count() >= greatest(toInt64({{devices}}), 1)
    ) AS means
    GROUP BY named, unnamed
)
HAVING devices > 0
SETTINGS skip_unavailable_shards = 0
