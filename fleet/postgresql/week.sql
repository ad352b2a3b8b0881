-- Rolls a week of days into the schema `weeks`: what the reports of a device come to, as one row. A report without a device, a
-- distribution that is not finite or has no values stay rows of their own. Run again, it puts the rows anew. All or nothing.
-- Identifiers cannot meet: those that came from outside follow the word `one`, and the length of a digest stands before it.
BEGIN;
LOCK TABLE weeks.reports IN SHARE ROW EXCLUSIVE MODE;
SELECT fleet_refuse('this day is no Monday') WHERE extract(isodow FROM {{week}}::date) <> 1;
SELECT fleet_refuse('the week has been rolled, and some of its days are gone')
WHERE (SELECT count(*) FROM public.reports WHERE day BETWEEN {{week}} AND {{week}}::date + 6)
      < (SELECT sum(reports) FROM weeks.reports WHERE day = {{week}});
DELETE FROM weeks.reports WHERE day = {{week}};
DELETE FROM weeks.scalar_states WHERE day = {{week}};
DELETE FROM weeks.distribution_states WHERE day = {{week}};
DELETE FROM weeks.histograms WHERE day = {{week}};

WITH chosen AS (
    SELECT *, CASE WHEN device = '' THEN concat('one ', report_id)
                   ELSE concat('week ', {{week}}::date, ' ', length(whitelist_digest), ' ', whitelist_digest, device) END AS rolled_id
    FROM public.reports WHERE day BETWEEN {{week}} AND {{week}}::date + 6
)
INSERT INTO weeks.reports
SELECT DISTINCT ON (rolled_id) rolled_id, device, {{week}}::date, created, whitelist_digest, task_id, language, preferred_language, region,
       count(*) OVER (PARTITION BY rolled_id)
FROM chosen ORDER BY rolled_id, created DESC;

WITH chosen AS (
    SELECT *, CASE WHEN device = '' THEN concat('one ', report_id) ELSE concat('week ', {{week}}::date, ' ', device) END AS rolled_id
    FROM public.scalars WHERE day BETWEEN {{week}} AND {{week}}::date + 6
)
INSERT INTO weeks.scalar_states
SELECT rolled_id, device, {{week}}::date, key, count(*), sum(value), min(value), max(value), var_pop(value) * count(*)
FROM chosen GROUP BY rolled_id, device, key;

INSERT INTO weeks.distribution_states
SELECT concat('one ', report_id), device, {{week}}::date, key, 1, count, minimum, maximum, mean, 0, m2, finite
FROM public.distributions
WHERE day BETWEEN {{week}} AND {{week}}::date + 6 AND (device = '' OR finite = 0 OR count = 0);

WITH chosen AS (
    SELECT *, min(mean) OVER (PARTITION BY key, device) AS pivot
    FROM public.distributions
    WHERE day BETWEEN {{week}} AND {{week}}::date + 6 AND device <> '' AND finite = 1 AND count > 0
), states AS (
    SELECT device, key, count(*) AS reports, sum(count) AS count, min(minimum) AS minimum, max(maximum) AS maximum, pivot,
           fleet_merged(ARRAY[count, count * (mean - pivot), greatest(m2, 0)]) AS state
    FROM chosen GROUP BY key, device, pivot
)
INSERT INTO weeks.distribution_states
SELECT concat('week ', {{week}}::date, ' ', device), device, {{week}}::date, key, reports, count, minimum, maximum, pivot + shift,
       shift - (pivot + shift - pivot), state[3], 1
FROM states CROSS JOIN LATERAL float8_avg(state) AS shift;

WITH chosen AS (
    SELECT h.*, CASE WHEN h.device = '' THEN concat('one ', h.report_id)
                     ELSE concat('week ', {{week}}::date, ' ', length(whitelist_digest), ' ', whitelist_digest, h.device) END AS rolled_id
    FROM public.histograms h JOIN public.reports r ON r.report_id = h.report_id AND r.day = h.day
    WHERE h.day BETWEEN {{week}} AND {{week}}::date + 6 AND r.day BETWEEN {{week}} AND {{week}}::date + 6 AND count > 0
)
INSERT INTO weeks.histograms
SELECT rolled_id, device, {{week}}::date, key, lower, upper, sum(count) FROM chosen GROUP BY rolled_id, device, key, lower, upper;
COMMIT;
