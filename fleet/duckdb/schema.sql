-- The tables of the fleet.
CREATE TABLE IF NOT EXISTS reports (
    report_id VARCHAR NOT NULL, device VARCHAR NOT NULL, day DATE NOT NULL, created VARCHAR NOT NULL,
    whitelist_digest VARCHAR NOT NULL, task_id VARCHAR NOT NULL, language VARCHAR NOT NULL,
    preferred_language VARCHAR NOT NULL, region VARCHAR NOT NULL
);
CREATE TABLE IF NOT EXISTS scalars (
    report_id VARCHAR NOT NULL, device VARCHAR NOT NULL, day DATE NOT NULL, key VARCHAR NOT NULL, value BIGINT NOT NULL
);
CREATE TABLE IF NOT EXISTS distributions (
    report_id VARCHAR NOT NULL, device VARCHAR NOT NULL, day DATE NOT NULL, key VARCHAR NOT NULL, count BIGINT NOT NULL,
    minimum DOUBLE NOT NULL, maximum DOUBLE NOT NULL, mean DOUBLE NOT NULL, m2 DOUBLE NOT NULL, finite TINYINT NOT NULL
);
CREATE TABLE IF NOT EXISTS histograms (
    report_id VARCHAR NOT NULL, device VARCHAR NOT NULL, day DATE NOT NULL, key VARCHAR NOT NULL, lower DOUBLE NOT NULL,
    upper DOUBLE NOT NULL, count BIGINT NOT NULL
);

-- The weeks: a schema of its own, in which week.sql puts one row for the rows that a device's reports of a week have. Its report_id
-- is made of week and device, its day is the Monday. What such a row has more than that of a report (the number of reports, sums that
-- outgrow 64 bits, what the double of a mean leaves of it) the views of the days make up, so that one query reads both.
CREATE SCHEMA IF NOT EXISTS weeks;
CREATE TABLE IF NOT EXISTS weeks.reports (
    report_id VARCHAR NOT NULL, device VARCHAR NOT NULL, day DATE NOT NULL, created VARCHAR NOT NULL,
    whitelist_digest VARCHAR NOT NULL, task_id VARCHAR NOT NULL, language VARCHAR NOT NULL,
    preferred_language VARCHAR NOT NULL, region VARCHAR NOT NULL, reports BIGINT NOT NULL
);
CREATE TABLE IF NOT EXISTS weeks.scalar_states (
    report_id VARCHAR NOT NULL, device VARCHAR NOT NULL, day DATE NOT NULL, key VARCHAR NOT NULL, reports BIGINT NOT NULL,
    total HUGEINT NOT NULL, minimum BIGINT NOT NULL, maximum BIGINT NOT NULL, m2 DOUBLE NOT NULL
);
CREATE OR REPLACE VIEW scalar_states AS
    SELECT report_id, device, day, key, 1::BIGINT AS reports, value::HUGEINT AS total, value AS minimum, value AS maximum, 0::DOUBLE AS m2
    FROM main.scalars;
CREATE TABLE IF NOT EXISTS weeks.distribution_states (
    report_id VARCHAR NOT NULL, device VARCHAR NOT NULL, day DATE NOT NULL, key VARCHAR NOT NULL, reports BIGINT NOT NULL,
    count HUGEINT NOT NULL, minimum DOUBLE NOT NULL, maximum DOUBLE NOT NULL, mean DOUBLE NOT NULL, mean_rest DOUBLE NOT NULL,
    m2 DOUBLE NOT NULL, finite TINYINT NOT NULL
);
CREATE OR REPLACE VIEW distribution_states AS
    SELECT report_id, device, day, key, 1::BIGINT AS reports, count, minimum, maximum, mean, 0::DOUBLE AS mean_rest, m2, finite
    FROM main.distributions;
CREATE TABLE IF NOT EXISTS weeks.histograms (
    report_id VARCHAR NOT NULL, device VARCHAR NOT NULL, day DATE NOT NULL, key VARCHAR NOT NULL, lower DOUBLE NOT NULL,
    upper DOUBLE NOT NULL, count HUGEINT NOT NULL
);
