-- Quantiles estimated from the merged histogram, those of different whitelists apart: found in the bucket that holds them, as if
-- its values lay evenly in it. A bucket that is open on one side (a bound of 1e100 and more is none) answers with its other bound.
SELECT
    digest AS whitelist_digest,
    quantile,
    multiIf(low <= -1e100, high, high >= 1e100, low, low + (high - low) * (wanted - (until - within)) / within) AS estimate
FROM (
    SELECT digest, quantile, wanted, arrayFirstIndex(x -> x >= wanted, ends) AS place, buckets[place].1 AS low,
           buckets[place].2 AS high, buckets[place].3 AS within, ends[place] AS until
    FROM (
        SELECT digest, buckets, arrayCumSum(arrayMap(x -> x.3, buckets)) AS ends,
               arrayJoin([0.05, 0.25, 0.5, 0.75, 0.95, 0.99]) AS quantile, quantile * ends[length(ends)] AS wanted
        FROM (
            SELECT digest, arraySort(groupArray((low, high, bucket_count))) AS buckets
            FROM (
                SELECT digest, low, high, sum(toFloat64(n)) AS bucket_count, uniqExactState(named, unnamed) AS bucket_devices
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
                GROUP BY digest, low, high
            )
            GROUP BY digest
            HAVING uniqExactMerge(bucket_devices) >= toInt64({{devices}})
        )
    )
)
ORDER BY digest, quantile
SETTINGS skip_unavailable_shards = 0
