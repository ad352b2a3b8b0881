-- The tables of the fleet, on every server of the cluster called `fleet`, in the database that is current: what a server keeps
-- (*_local), and the whole over all of them. A report is put by its report_id, so that it lies whole on one server and meets
-- its copies there, the queries count it once, and merges drop the copies as they come by. What a row of a week has more than
-- that of a report is an ALIAS here, so that one query reads both.
-- Days are texts (2026-11-24), in which order and equality are those of the days, for every year: a Date ends in 2105 or 2149.

CREATE TABLE IF NOT EXISTS reports_local (
    report_id String, device String, day String, created String, whitelist_digest String, task_id String,
    language String, preferred_language String, region String
) ENGINE = ReplacingMergeTree PARTITION BY substring(day, 1, 7) ORDER BY (day, report_id, device);

CREATE TABLE IF NOT EXISTS scalars_local (
    report_id String, device String, day String, key String, value Int64,
    reports Int64 ALIAS toInt64(1), total Decimal(38, 0) ALIAS toDecimal128(value, 0), minimum Int64 ALIAS value,
    maximum Int64 ALIAS value, m2 Float64 ALIAS toFloat64(0)
) ENGINE = ReplacingMergeTree PARTITION BY substring(day, 1, 7) ORDER BY (key, day, report_id, device);

CREATE TABLE IF NOT EXISTS distributions_local (
    report_id String, device String, day String, key String, count Int64,
    minimum Float64, maximum Float64, mean Float64, m2 Float64, finite UInt8,
    reports Int64 ALIAS toInt64(1), mean_rest Float64 ALIAS toFloat64(0)
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

-- The weeks: a database of the same tables, in which week.sql puts one row for the rows that a device's reports of a week have. Its
-- report_id is made of week and device, its day is the Monday. mean_rest is what the double before it leaves of a mean.
CREATE DATABASE IF NOT EXISTS weeks;

CREATE TABLE IF NOT EXISTS weeks.reports_local (
    report_id String, device String, day String, created String, whitelist_digest String, task_id String,
    language String, preferred_language String, region String, reports Int64
) ENGINE = ReplacingMergeTree PARTITION BY day ORDER BY (report_id, device);

CREATE TABLE IF NOT EXISTS weeks.scalars_local (
    report_id String, device String, day String, key String, reports Int64, total Decimal(38, 0), minimum Int64, maximum Int64, m2 Float64
) ENGINE = ReplacingMergeTree PARTITION BY day ORDER BY (key, report_id, device);

CREATE TABLE IF NOT EXISTS weeks.distributions_local (
    report_id String, device String, day String, key String, count Decimal(38, 0), minimum Float64, maximum Float64,
    mean Float64, mean_rest Float64, m2 Float64, finite UInt8, reports Int64
) ENGINE = ReplacingMergeTree PARTITION BY day ORDER BY (key, report_id, device);

CREATE TABLE IF NOT EXISTS weeks.histograms_local (
    report_id String, device String, day String, key String, lower Float64, upper Float64, count Int64
) ENGINE = ReplacingMergeTree PARTITION BY day ORDER BY (key, report_id, device, lower, upper);

CREATE TABLE IF NOT EXISTS weeks.reports AS weeks.reports_local
    ENGINE = Distributed(fleet, weeks, reports_local, cityHash64(report_id));

CREATE TABLE IF NOT EXISTS weeks.scalars AS weeks.scalars_local
    ENGINE = Distributed(fleet, weeks, scalars_local, cityHash64(report_id));

CREATE TABLE IF NOT EXISTS weeks.distributions AS weeks.distributions_local
    ENGINE = Distributed(fleet, weeks, distributions_local, cityHash64(report_id));

CREATE TABLE IF NOT EXISTS weeks.histograms AS weeks.histograms_local
    ENGINE = Distributed(fleet, weeks, histograms_local, cityHash64(report_id));
