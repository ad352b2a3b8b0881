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
