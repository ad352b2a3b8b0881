-- The merged histogram, a row a bucket; those of different whitelists, whose buckets differ, apart. share gives each device one
-- vote. Bounds lose the sign of their zeros (+ 0.), since -0 would be a group of its own.
SELECT
    digest AS whitelist_digest,
    low AS lower,
    high AS upper,
    sum(toDecimal128(bucket_count, 0)) AS count,
    sumKahan(bucket_count / device_count) / any(all_devices) AS share
FROM (
    SELECT digest, device_count, bucket.1 AS low, bucket.2 AS high, bucket.3 AS bucket_count
    FROM (
        SELECT digest, named, unnamed, sumKahan(toFloat64(n)) AS device_count,
               arrayJoin(groupArray((low, high, n))) AS bucket
        FROM (
            SELECT report_id, lower + 0. AS low, upper + 0. AS high, any(count) AS n,
                   minIf(device, device != '') AS named, if(named = '', report_id, '') AS unnamed
            FROM histograms WHERE key = {{key}} AND day >= {{first}} AND day <= {{last}} AND count > 0
            GROUP BY report_id, low, high
        ) AS entries
        ALL INNER JOIN (
            SELECT report_id, any(whitelist_digest) AS digest
            FROM reports WHERE day >= {{first}} AND day <= {{last}} GROUP BY report_id
        ) AS whitelists USING (report_id)
        GROUP BY digest, named, unnamed
    )
) AS buckets
ALL INNER JOIN (
    SELECT digest, toInt64(uniqExact(named, unnamed)) AS all_devices
    FROM (
        SELECT report_id, minIf(device, device != '') AS named, if(named = '', report_id, '') AS unnamed
        FROM histograms WHERE key = {{key}} AND day >= {{first}} AND day <= {{last}} AND count > 0 GROUP BY report_id
    ) AS entries
    ALL INNER JOIN (
        SELECT report_id, any(whitelist_digest) AS digest
        FROM reports WHERE day >= {{first}} AND day <= {{last}} GROUP BY report_id
    ) AS whitelists USING (report_id)
    GROUP BY digest
    HAVING all_devices >= toInt64({{devices}})
) AS fleet USING (digest)
GROUP BY digest, low, high
ORDER BY digest, low, high
SETTINGS skip_unavailable_shards = 0
