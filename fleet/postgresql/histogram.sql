-- The merged histogram, a row a bucket, those of different whitelists, whose buckets differ, apart. share gives each device one vote.
WITH counts AS (
    SELECT whitelist_digest, lower, upper, sum(count) AS bucket_count,
           sum(sum(count)) OVER (PARTITION BY whitelist_digest, h.device, CASE WHEN h.device = '' THEN h.report_id END) AS device_count,
           dense_rank() OVER (PARTITION BY whitelist_digest ORDER BY h.device, CASE WHEN h.device = '' THEN h.report_id END) AS place
    FROM histograms h JOIN reports r ON r.report_id = h.report_id AND r.day = h.day
    WHERE key = {{key}} AND md5(key)::uuid = md5({{key}})::uuid AND h.day BETWEEN {{first}} AND {{last}}
          AND r.day BETWEEN {{first}} AND {{last}} AND count > 0
    GROUP BY whitelist_digest, lower, upper, h.device, CASE WHEN h.device = '' THEN h.report_id END
), ranked AS (
    SELECT *, max(place) OVER (PARTITION BY whitelist_digest) AS devices FROM counts
)
SELECT whitelist_digest, lower + 0 AS lower, upper + 0 AS upper, sum(bucket_count) AS count,
       sum(bucket_count::double precision / device_count::double precision) / devices AS share
FROM ranked WHERE devices >= {{devices}}
GROUP BY whitelist_digest, lower, upper, devices
ORDER BY whitelist_digest COLLATE "C", lower, upper
