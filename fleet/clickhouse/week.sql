-- Rolls a week of the days' database into the database `weeks`: what the reports of a device come to, as one row. A report without
-- a device, a distribution that is not finite or has no values, and a histogram with a bucket beyond 2^32 stay rows of their own. Run
-- again, it puts the same rows in their places. The rows of `reports` come last: a week that has them is whole. Identifiers cannot
-- meet: those that came from outside follow the word `one`, and the length of a digest stands before it.
-- First, that nothing is lost: each line says as an error what is wrong.
SELECT toUInt8(if(toDayOfWeek(toDate({{week}})) != 1, 'this day is no Monday', '0')) FORMAT Null;
SELECT toUInt8(if((SELECT uniqExact(report_id) FROM reports WHERE day >= {{week}} AND day <= toString(toDate({{week}}) + 6)) <
                  (SELECT sum(n) FROM (SELECT any(reports) AS n FROM weeks.reports WHERE day = {{week}} GROUP BY report_id)),
                  'the week has been rolled, and some of its days are gone', '0')) FORMAT Null;

INSERT INTO weeks.scalars (report_id, device, day, key, reports, total, minimum, maximum, m2)
SELECT if(unnamed = '', concat('week ', {{week}}, ' ', named), concat('one ', unnamed)), named, {{week}}, metric, n, s, low, high, squares
FROM (
    SELECT metric, named, unnamed, toInt64(count()) AS n, sum(toDecimal128(report_value, 0)) AS s, min(report_value) AS low,
           max(report_value) AS high, s / n AS whole, toFloat64(s - whole * n) / n AS fraction,
           groupArray(report_value) AS report_values,
           arrayReduce('sumKahan', arrayMap(x -> pow(toFloat64(toDecimal128(x, 0) - whole) - fraction, 2), report_values)) AS squares
    FROM (
        SELECT report_id, key AS metric, minIf(device, device != '') AS named, if(named = '', report_id, '') AS unnamed,
               any(value) AS report_value
        FROM scalars WHERE day >= {{week}} AND day <= toString(toDate({{week}}) + 6) GROUP BY report_id, metric
    )
    GROUP BY metric, named, unnamed
)
SETTINGS skip_unavailable_shards = 0, max_bytes_before_external_group_by = 2000000000, distributed_aggregation_memory_efficient = 1;

INSERT INTO weeks.distributions (report_id, device, day, key, count, minimum, maximum, mean, mean_rest, m2, finite, reports)
SELECT if(alone = '', concat('week ', {{week}}, ' ', named), concat('one ', alone)), named, {{week}}, metric, all_values, low, high,
       pivot + shift, if(alone = '', shift - (pivot + shift - pivot), 0.), if(alone = '', squares, first_squares), is_finite, row_reports
FROM (
    SELECT metric, named, alone, sum(toDecimal128(n, 0)) AS all_values, min(report_minimum) AS low, max(report_maximum) AS high,
           min(center) AS pivot, groupArray(toFloat64(n)) AS weights, groupArray(center) AS centers, groupArray(deviations) AS rests,
           arrayReduce('sumKahan', arrayMap((w, x) -> w * (x - pivot), weights, centers)) AS shifts,
           if(alone = '', shifts / toFloat64(all_values), 0.) AS shift,
           arrayMap((w, x, d) -> greatest(d, 0.) + w * pow(x - pivot - shift, 2), weights, centers, rests) AS parts,
           arrayReduce('sumKahan', parts) AS squares,
           any(deviations) AS first_squares, any(report_finite) AS is_finite, toInt64(count()) AS row_reports
    FROM (
        SELECT report_id, key AS metric, minIf(device, device != '') AS named, any(count) AS n, any(minimum) AS report_minimum,
               any(maximum) AS report_maximum, any(mean) AS center, any(m2) AS deviations, any(finite) AS report_finite,
               if(named = '' OR report_finite = 0 OR n = 0, report_id, '') AS alone
        FROM distributions WHERE day >= {{week}} AND day <= toString(toDate({{week}}) + 6) GROUP BY report_id, metric
    )
    GROUP BY metric, named, alone
)
SETTINGS skip_unavailable_shards = 0, max_bytes_before_external_group_by = 2000000000, distributed_aggregation_memory_efficient = 1;

INSERT INTO weeks.histograms (report_id, device, day, key, lower, upper, count)
SELECT if(alone = '', concat('week ', {{week}}, ' ', toString(length(digest)), ' ', digest, named), concat('one ', alone)),
       named, {{week}}, metric, low, high, n
FROM (
    SELECT digest, metric, named, alone, low, high, sum(bucket_count) AS n
    FROM (
        SELECT report_id, key AS metric, lower + 0. AS low, upper + 0. AS high, any(count) AS bucket_count,
               minIf(device, device != '') AS named,
               if(named = '' OR report_id GLOBAL IN (
                   SELECT report_id FROM histograms WHERE day >= {{week}} AND day <= toString(toDate({{week}}) + 6) AND count > 4294967296
               ), report_id, '') AS alone
        FROM histograms WHERE day >= {{week}} AND day <= toString(toDate({{week}}) + 6) AND count > 0 GROUP BY report_id, metric, low, high
    ) AS entries
    ALL INNER JOIN (
        SELECT report_id, any(whitelist_digest) AS digest
        FROM reports WHERE day >= {{week}} AND day <= toString(toDate({{week}}) + 6) GROUP BY report_id
    ) AS whitelists USING (report_id)
    GROUP BY digest, metric, named, alone, low, high
)
SETTINGS skip_unavailable_shards = 0, max_bytes_before_external_group_by = 2000000000, distributed_aggregation_memory_efficient = 1;

INSERT INTO weeks.reports (report_id, device, day, created, whitelist_digest, task_id, language, preferred_language, region, reports)
SELECT if(alone = '', concat('week ', {{week}}, ' ', toString(length(digest)), ' ', digest, named), concat('one ', alone)),
       named, {{week}}, newest.1, digest, newest.2, newest.3, newest.4, newest.5, row_reports
FROM (
    SELECT digest, named, alone, max(about) AS newest, toInt64(count()) AS row_reports
    FROM (
        SELECT report_id, any(whitelist_digest) AS digest, minIf(device, device != '') AS named,
               if(named = '' OR report_id GLOBAL IN (
                   SELECT report_id FROM histograms WHERE day >= {{week}} AND day <= toString(toDate({{week}}) + 6) AND count > 4294967296
               ), report_id, '') AS alone,
               any((created, task_id, language, preferred_language, region)) AS about
        FROM reports WHERE day >= {{week}} AND day <= toString(toDate({{week}}) + 6) GROUP BY report_id
    )
    GROUP BY digest, named, alone
)
SETTINGS skip_unavailable_shards = 0, max_bytes_before_external_group_by = 2000000000, distributed_aggregation_memory_efficient = 1;
