-- The tables of the fleet, on every server of the cluster called `fleet`, in the database that is current: what a server keeps
-- (*_local), and the whole over all of them. A report is put by its report_id, so that it lies whole on one server and meets
-- its copies there, the queries count it once, and merges drop the copies as they come by.
-- Days are texts (2026-11-24), in which order and equality are those of the days, for every year: a Date ends in 2105 or 2149.

CREATE TABLE IF NOT EXISTS reports_local (
    report_id String, device String, day String, created String, whitelist_digest String, task_id String,
    language String, preferred_language String, region String
) ENGINE = ReplacingMergeTree PARTITION BY substring(day, 1, 7) ORDER BY (day, report_id, device);

CREATE TABLE IF NOT EXISTS scalars_local (
    report_id String, device String, day String, key String, value Int64
) ENGINE = ReplacingMergeTree PARTITION BY substring(day, 1, 7) ORDER BY (key, day, report_id, device);

CREATE TABLE IF NOT EXISTS distributions_local (
    report_id String, device String, day String, key String, count Int64,
    minimum Float64, maximum Float64, mean Float64, m2 Float64, finite UInt8
) ENGINE = ReplacingMergeTree PARTITION BY substring(day, 1, 7) ORDER BY (key, day, report_id, device);

CREATE TABLE IF NOT EXISTS histograms_local (
    report_id String, device String, day String, key String, lower Float64, upper Float64, count Int64
) ENGINE = ReplacingMergeTree PARTITION BY substring(day, 1, 7) ORDER BY (key, day, report_id, device, lower, upper);

CREATE TABLE IF NOT EXISTS reports AS reports_local
    ENGINE = Distributed(fleet, currentDatabase(), reports_local, cityHash64(report_id));

CREATE TABLE IF NOT EXISTS scalars AS scalars_local
    ENGINE = Distributed(fleet, currentDatabase(), scalars_local, cityHash64(report_id));

CREATE TABLE IF NOT EXISTS distributions AS distributions_local
    ENGINE = Distributed(fleet, currentDatabase(), distributions_local, cityHash64(report_id));

CREATE TABLE IF NOT EXISTS histograms AS histograms_local
    ENGINE = Distributed(fleet, currentDatabase(), histograms_local, cityHash64(report_id));
