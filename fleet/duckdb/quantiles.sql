-- Quantiles estimated from the merged histogram, those of different whitelists apart: found in the bucket that holds them, as if
-- its values lay evenly in it. A bucket that is open on one side (a bound of 1e100 and more is none) answers with its other bound.
WITH whitelists AS (
    SELECT report_id, any_value(whitelist_digest) AS whitelist_digest
    FROM reports WHERE day BETWEEN {{first}} AND {{last}} GROUP BY report_id
), entries AS (
    SELECT report_id, lower + 0 AS low, upper + 0 AS high, any_value(count) AS n,
           coalesce(min(device) FILTER (device <> ''), '') AS named, if(named = '', report_id, '') AS unnamed
    FROM histograms WHERE key = {{key}} AND day BETWEEN {{first}} AND {{last}} AND count > 0 GROUP BY report_id, low, high
), chosen AS (
    SELECT * FROM entries JOIN whitelists USING (report_id)
), totals AS (
    SELECT whitelist_digest, sum(n)::DOUBLE AS total FROM chosen GROUP BY whitelist_digest
    HAVING count(DISTINCT (named, unnamed)) >= {{devices}}::BIGINT
), buckets AS (
    SELECT whitelist_digest, low, high, sum(n)::DOUBLE AS within,
           (sum(sum(n)) OVER (PARTITION BY whitelist_digest ORDER BY low, high))::DOUBLE AS until
    FROM chosen GROUP BY whitelist_digest, low, high
)
SELECT
    whitelist_digest, quantile,
    arg_min(CASE WHEN low <= -1e100 THEN high WHEN high >= 1e100 THEN low
                 ELSE low + (high - low) * (quantile * total - (until - within)) / within END, (low, high)) AS estimate
FROM totals
CROSS JOIN (SELECT unnest([0.05, 0.25, 0.5, 0.75, 0.95, 0.99]::DOUBLE[]) AS quantile)
JOIN buckets USING (whitelist_digest)
WHERE until >= quantile * total
GROUP BY whitelist_digest, quantile
ORDER BY whitelist_digest, quantile
