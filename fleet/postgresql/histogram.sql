-- The merged histogram, a row a bucket; those of different whitelists, whose buckets differ, apart. share gives each device one vote.
WITH chosen AS (
    SELECT whitelist_digest, h.device, CASE WHEN h.device = '' THEN h.report_id END AS unnamed, lower, upper, count
    FROM histograms h JOIN reports r ON r.report_id = h.report_id AND r.day = h.day
    WHERE key = {{key}} AND md5(key)::uuid = md5({{key}})::uuid AND h.day BETWEEN {{first}} AND {{last}}
          AND r.day BETWEEN {{first}} AND {{last}} AND count > 0
), device_counts AS (
    SELECT whitelist_digest, device, unnamed, sum(count) AS device_count FROM chosen GROUP BY whitelist_digest, device, unnamed
), whitelists AS (
    SELECT whitelist_digest, count(*) AS devices FROM device_counts GROUP BY whitelist_digest HAVING count(*) >= {{devices}}
)
SELECT whitelist_digest, lower + 0 AS lower, upper + 0 AS upper, sum(count) AS count,
       sum(count::double precision / device_count::double precision) / devices AS share
FROM chosen JOIN device_counts d USING (whitelist_digest, device) JOIN whitelists USING (whitelist_digest)
WHERE chosen.unnamed IS NOT DISTINCT FROM d.unnamed
GROUP BY whitelist_digest, lower, upper, devices
ORDER BY whitelist_digest COLLATE "C", lower, upper
