-- The tables of the fleet, partitioned by month; rows come in by load.sql, which makes the months that it meets. From version 15 on.
-- A row that comes again (from whichever folder) is one row: the unique indexes hold that. They are over digests of the texts,
-- since texts may be longer than an entry of an index.
SET client_min_messages = warning;

CREATE TABLE IF NOT EXISTS reports (
    report_id text NOT NULL, device text NOT NULL, day date NOT NULL, created text NOT NULL, whitelist_digest text NOT NULL,
    task_id text NOT NULL, language text NOT NULL, preferred_language text NOT NULL, region text NOT NULL
) PARTITION BY RANGE (day);
CREATE TABLE IF NOT EXISTS reports_default PARTITION OF reports DEFAULT;
CREATE UNIQUE INDEX IF NOT EXISTS reports_once ON reports ((md5(report_id)::uuid), day);

CREATE TABLE IF NOT EXISTS scalars (
    report_id text NOT NULL, device text NOT NULL, day date NOT NULL, key text NOT NULL, value bigint NOT NULL
) PARTITION BY RANGE (day);
CREATE TABLE IF NOT EXISTS scalars_default PARTITION OF scalars DEFAULT;
CREATE UNIQUE INDEX IF NOT EXISTS scalars_once ON scalars ((md5(key)::uuid), day, (md5(report_id)::uuid));

CREATE TABLE IF NOT EXISTS distributions (
    report_id text NOT NULL, device text NOT NULL, day date NOT NULL, key text NOT NULL, count bigint NOT NULL,
    minimum double precision NOT NULL, maximum double precision NOT NULL, mean double precision NOT NULL,
    m2 double precision NOT NULL, finite smallint NOT NULL
) PARTITION BY RANGE (day);
CREATE TABLE IF NOT EXISTS distributions_default PARTITION OF distributions DEFAULT;
CREATE UNIQUE INDEX IF NOT EXISTS distributions_once ON distributions ((md5(key)::uuid), day, (md5(report_id)::uuid));

CREATE TABLE IF NOT EXISTS histograms (
    report_id text NOT NULL, device text NOT NULL, day date NOT NULL, key text NOT NULL, lower double precision NOT NULL,
    upper double precision NOT NULL, count bigint NOT NULL
) PARTITION BY RANGE (day);
CREATE TABLE IF NOT EXISTS histograms_default PARTITION OF histograms DEFAULT;
CREATE UNIQUE INDEX IF NOT EXISTS histograms_once ON histograms ((md5(key)::uuid), day, (md5(report_id)::uuid), lower, upper);

-- Merges states (number of values, their sum, their squared deviations) pairwise, by what the server merges those of its own
-- parallel workers with; float8_avg and float8_stddev_pop read a state.
CREATE OR REPLACE AGGREGATE fleet_merged(double precision[]) (
    SFUNC = float8_combine, STYPE = double precision[], COMBINEFUNC = float8_combine, INITCOND = '{0,0,0}', PARALLEL = SAFE
);

-- Takes what a COPY of load.sql put into the table `incoming`, whose rows are those of the table that the trigger's argument names.
-- Of a row's copies the one whose device has a name counts, of two names the first.
CREATE OR REPLACE FUNCTION fleet_take() RETURNS trigger LANGUAGE plpgsql AS $$
DECLARE
    target CONSTANT text := TG_ARGV[0];
    entry CONSTANT text := CASE target
        WHEN 'reports' THEN '(md5(report_id)::uuid), day'
        WHEN 'histograms' THEN '(md5(key)::uuid), day, (md5(report_id)::uuid), lower, upper'
        ELSE '(md5(key)::uuid), day, (md5(report_id)::uuid)' END;
    month date;
    partition text;
BEGIN
    IF NOT EXISTS (SELECT FROM incoming) THEN
        RAISE WARNING 'no rows of % came', target;
    END IF;
    -- What a clock that went astray dates stays in the default partition, and so does a month whose rows came there before its time.
    FOR month IN SELECT DISTINCT date_trunc('month', day)::date FROM incoming WHERE day BETWEEN '2020-01-01' AND current_date + 366
    LOOP
        partition := target || to_char(month, '"_"YYYY"_"MM');
        IF to_regclass(quote_ident(partition)) IS NULL THEN
            PERFORM pg_advisory_xact_lock(hashtext('fleet ' || target));
            BEGIN
                EXECUTE format('CREATE TABLE IF NOT EXISTS %I PARTITION OF %I FOR VALUES FROM (%L) TO (%L)',
                               partition, target, month, (month + interval '1 month')::date);
            EXCEPTION WHEN check_violation THEN NULL;
            END;
        END IF;
    END LOOP;
    EXECUTE format(
        'INSERT INTO %1$I AS kept SELECT DISTINCT ON (%2$s) * FROM incoming ORDER BY %2$s, device = '''', device COLLATE "C"
         ON CONFLICT (%2$s) DO UPDATE SET device = excluded.device
         WHERE excluded.device <> '''' AND (kept.device = '''' OR excluded.device COLLATE "C" < kept.device COLLATE "C")',
        target, entry);
    RETURN NULL;
END
$$;

-- The weeks: a schema of its own, in which week.sql puts one row for the rows that a device's reports of a week have. Its report_id
-- is made of week and device, its day is the Monday. What such a row has more than that of a report (the number of reports, sums that
-- outgrow 64 bits, what the double of a mean leaves of it) the views of the days make up, so that one query reads both.
CREATE SCHEMA IF NOT EXISTS weeks;
CREATE TABLE IF NOT EXISTS weeks.reports (LIKE reports, reports bigint NOT NULL);
CREATE UNIQUE INDEX IF NOT EXISTS reports_once ON weeks.reports (day, (md5(report_id)::uuid));

CREATE TABLE IF NOT EXISTS weeks.scalar_states (
    report_id text NOT NULL, device text NOT NULL, day date NOT NULL, key text NOT NULL, reports bigint NOT NULL, total numeric NOT NULL,
    minimum bigint NOT NULL, maximum bigint NOT NULL, m2 numeric NOT NULL
);
CREATE UNIQUE INDEX IF NOT EXISTS scalars_once ON weeks.scalar_states ((md5(key)::uuid), day, (md5(report_id)::uuid));
CREATE OR REPLACE VIEW scalar_states AS
    SELECT report_id, device, day, key, 1::bigint AS reports, value::numeric AS total, value AS minimum, value AS maximum, 0::numeric AS m2
    FROM scalars;

CREATE TABLE IF NOT EXISTS weeks.distribution_states (
    report_id text NOT NULL, device text NOT NULL, day date NOT NULL, key text NOT NULL, reports bigint NOT NULL, count numeric NOT NULL,
    minimum double precision NOT NULL, maximum double precision NOT NULL, mean double precision NOT NULL,
    mean_rest double precision NOT NULL, m2 double precision NOT NULL, finite smallint NOT NULL
);
CREATE UNIQUE INDEX IF NOT EXISTS distributions_once ON weeks.distribution_states ((md5(key)::uuid), day, (md5(report_id)::uuid));
CREATE OR REPLACE VIEW distribution_states AS
    SELECT report_id, device, day, key, 1::bigint AS reports, count, minimum, maximum, mean, 0::double precision AS mean_rest, m2, finite
    FROM distributions;

CREATE TABLE IF NOT EXISTS weeks.histograms (
    report_id text NOT NULL, device text NOT NULL, day date NOT NULL, key text NOT NULL, lower double precision NOT NULL,
    upper double precision NOT NULL, count numeric NOT NULL
);
CREATE UNIQUE INDEX IF NOT EXISTS histograms_once ON weeks.histograms ((md5(key)::uuid), day, (md5(report_id)::uuid), lower, upper);

-- Ends a statement, and with it the transaction, with a reason.
CREATE OR REPLACE FUNCTION fleet_refuse(reason text) RETURNS void LANGUAGE plpgsql AS $$
BEGIN
    RAISE EXCEPTION '%', reason;
END
$$;
