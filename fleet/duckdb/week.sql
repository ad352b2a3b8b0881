-- Rolls a week of days into the schema `weeks`: what the reports of a device come to, as one row. A report without a device, a
-- distribution that is not finite or has no values stay rows of their own. Run again, it puts the rows anew. All or nothing.
-- Identifiers cannot meet: those that came from outside follow the word `one`, and the length of a digest stands before it.
SELECT error('this day is no Monday') WHERE isodow({{week}}::DATE) <> 1;
SELECT error('the week has been rolled, and some of its days are gone')
WHERE (SELECT count(DISTINCT report_id) FROM main.reports WHERE day BETWEEN {{week}} AND {{week}}::DATE + 6)
      < (SELECT sum(reports) FROM weeks.reports WHERE day = {{week}});
BEGIN;
DELETE FROM weeks.reports WHERE day = {{week}};
DELETE FROM weeks.scalar_states WHERE day = {{week}};
DELETE FROM weeks.distribution_states WHERE day = {{week}};
DELETE FROM weeks.histograms WHERE day = {{week}};

WITH chosen AS (
    SELECT any_value(whitelist_digest) AS digest, coalesce(min(device) FILTER (device <> ''), '') AS named,
           if(named = '', concat('one ', report_id), concat('week ', {{week}}, ' ', length(digest), ' ', digest, named)) AS rolled_id,
           any_value((created, task_id, language, preferred_language, region)) AS about
    FROM main.reports WHERE day BETWEEN {{week}} AND {{week}}::DATE + 6 GROUP BY report_id
)
INSERT INTO weeks.reports
SELECT rolled_id, named, {{week}}, max(about)[1], digest, max(about)[2], max(about)[3], max(about)[4], max(about)[5], count(*)
FROM chosen GROUP BY rolled_id, named, digest;

WITH chosen AS MATERIALIZED (
    SELECT key, any_value(value) AS value, coalesce(min(device) FILTER (device <> ''), '') AS named,
           if(named = '', concat('one ', report_id), concat('week ', {{week}}, ' ', named)) AS rolled_id
    FROM main.scalars WHERE day BETWEEN {{week}} AND {{week}}::DATE + 6 GROUP BY report_id, key
), sums AS (
    SELECT rolled_id, key, count(*) AS n, sum(value) AS s, s // n AS whole, (s - whole * n)::DOUBLE / n AS fraction
    FROM chosen GROUP BY rolled_id, key
)
INSERT INTO weeks.scalar_states
SELECT rolled_id, named, {{week}}, key, any_value(n), any_value(s), min(value), max(value),
       fsum(((value - whole)::DOUBLE - fraction) ** 2)
FROM chosen JOIN sums USING (rolled_id, key) GROUP BY rolled_id, named, key;

WITH chosen AS MATERIALIZED (
    SELECT key, any_value(count) AS n, any_value(minimum) AS minimum, any_value(maximum) AS maximum, any_value(mean) AS center,
           any_value(m2) AS deviations, any_value(finite) AS finite, coalesce(min(device) FILTER (device <> ''), '') AS named,
           named = '' OR any_value(finite) = 0 OR n = 0 AS alone,
           if(alone, concat('one ', report_id), concat('week ', {{week}}, ' ', named)) AS rolled_id
    FROM main.distributions WHERE day BETWEEN {{week}} AND {{week}}::DATE + 6 GROUP BY report_id, key
), shifts AS (
    SELECT *, center - min(center) OVER (PARTITION BY rolled_id, key) AS shift FROM chosen WHERE NOT alone
), means AS (
    SELECT rolled_id, key, min(center) AS origin, fsum(n::DOUBLE * shift) / fsum(n::DOUBLE) AS mean_shift
    FROM shifts GROUP BY rolled_id, key
)
INSERT INTO weeks.distribution_states
SELECT rolled_id, named, {{week}}, key, 1, n, minimum, maximum, center, 0, deviations, finite FROM chosen WHERE alone
UNION ALL
SELECT rolled_id, named, {{week}}, key, count(*), sum(n), min(minimum), max(maximum), any_value(origin + mean_shift),
       any_value(mean_shift - (origin + mean_shift - origin)), fsum(greatest(deviations, 0) + n::DOUBLE * (shift - mean_shift) ** 2), 1
FROM shifts JOIN means USING (rolled_id, key) GROUP BY rolled_id, named, key;

WITH whitelists AS (
    SELECT report_id, any_value(whitelist_digest) AS digest
    FROM main.reports WHERE day BETWEEN {{week}} AND {{week}}::DATE + 6 GROUP BY report_id
), entries AS (
    SELECT report_id, key, lower + 0 AS low, upper + 0 AS high, any_value(count) AS n,
           coalesce(min(device) FILTER (device <> ''), '') AS named
    FROM main.histograms WHERE day BETWEEN {{week}} AND {{week}}::DATE + 6 AND count > 0 GROUP BY report_id, key, low, high
)
INSERT INTO weeks.histograms
SELECT if(named = '', concat('one ', report_id), concat('week ', {{week}}, ' ', length(digest), ' ', digest, named)) AS rolled_id, named,
       {{week}}, key, low, high, sum(n)
FROM entries JOIN whitelists USING (report_id) GROUP BY rolled_id, named, key, low, high;
COMMIT;
