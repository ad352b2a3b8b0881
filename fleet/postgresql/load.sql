-- Rows follow on standard input: psql -c "$(fleet/fill ...)" < FILE, or this text and the rows in one stream.
SET client_min_messages = warning;
DROP TABLE IF EXISTS pg_temp.incoming;
CREATE TEMPORARY TABLE incoming (LIKE "{{table}}");
CREATE TRIGGER taken AFTER INSERT ON incoming FOR EACH STATEMENT EXECUTE FUNCTION fleet_take({{table}});
COPY incoming FROM STDIN WITH (FORMAT text, HEADER);
