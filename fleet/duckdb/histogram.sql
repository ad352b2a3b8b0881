-- The merged histogram, a row a bucket; those of different whitelists, whose buckets differ, apart. share gives each device one vote.
WITH whitelists AS (
    SELECT report_id, any_value(whitelist_digest) AS whitelist_digest
    FROM reports WHERE day BETWEEN {{first}} AND {{last}} GROUP BY report_id
), entries AS (
    SELECT report_id, lower + 0 AS low, upper + 0 AS high, any_value(count) AS n,
           coalesce(min(device) FILTER (device <> ''), '') AS named, if(named = '', report_id, '') AS unnamed
    FROM histograms WHERE key = {{key}} AND day BETWEEN {{first}} AND {{last}} AND count > 0 GROUP BY report_id, low, high
), counts AS (
    SELECT whitelist_digest, named, unnamed, low, high, sum(n) AS bucket_count,
           sum(sum(n)) OVER (PARTITION BY whitelist_digest, named, unnamed) AS device_count,
           dense_rank() OVER (PARTITION BY whitelist_digest ORDER BY named, unnamed) AS place
    FROM entries JOIN whitelists USING (report_id) GROUP BY whitelist_digest, named, unnamed, low, high
), ranked AS (
    SELECT *, max(place) OVER (PARTITION BY whitelist_digest) AS devices FROM counts
)
SELECT whitelist_digest, low AS lower, high AS upper, sum(bucket_count) AS count,
       fsum(bucket_count::DOUBLE / device_count::DOUBLE) / devices AS share
FROM ranked WHERE devices >= {{devices}}::BIGINT
GROUP BY whitelist_digest, low, high, devices
ORDER BY whitelist_digest, low, high
