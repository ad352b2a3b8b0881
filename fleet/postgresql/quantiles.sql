-- Quantiles estimated from the merged histogram, those of different whitelists apart: found in the bucket that holds them, as if
-- its values lay evenly in it. A bucket that is open on one side (a bound of 1e100 and more is none) answers with its other bound; so
-- does one too narrow for a product, which the server would fail at.
WITH chosen AS (
    SELECT whitelist_digest, h.device, CASE WHEN h.device = '' THEN h.report_id END AS unnamed, lower, upper, count
    FROM histograms h JOIN reports r ON r.report_id = h.report_id AND r.day = h.day
    WHERE key = {{key}} AND md5(key)::uuid = md5({{key}})::uuid AND h.day BETWEEN {{first}} AND {{last}}
          AND r.day BETWEEN {{first}} AND {{last}} AND count > 0
), whitelists AS (
    SELECT whitelist_digest, sum(count)::double precision AS total FROM chosen
    GROUP BY whitelist_digest HAVING count(DISTINCT (device, unnamed)) >= {{devices}}
), buckets AS (
    SELECT whitelist_digest, lower, upper, sum(count)::double precision AS within,
           (sum(sum(count)) OVER (PARTITION BY whitelist_digest ORDER BY lower, upper))::double precision AS until
    FROM chosen GROUP BY whitelist_digest, lower, upper
)
SELECT
    whitelist_digest, quantile,
    CASE WHEN lower <= -1e100 THEN upper WHEN upper >= 1e100 THEN lower WHEN upper - lower < 1e-290 THEN upper
         ELSE lower + (upper - lower) * (wanted - (until - within)) / within END AS estimate
FROM whitelists
CROSS JOIN unnest(ARRAY[0.05, 0.25, 0.5, 0.75, 0.95, 0.99]::double precision[]) AS quantile
CROSS JOIN LATERAL (SELECT quantile * total AS wanted) AS place
CROSS JOIN LATERAL (
    SELECT * FROM buckets b WHERE b.whitelist_digest = whitelists.whitelist_digest AND until >= wanted ORDER BY lower, upper LIMIT 1
) AS bucket (digest, lower, upper, within, until)
ORDER BY whitelist_digest COLLATE "C", quantile
