-- The rows of one table, from a file of JSON lines. Statements for the other tables read nothing.
SELECT error('there is no table ' || {{table}})
WHERE {{table}} NOT IN ('reports', 'scalars', 'distributions', 'histograms');

INSERT INTO reports SELECT * FROM read_json({{file}}, format = 'newline_delimited', columns = {
    report_id: 'VARCHAR', device: 'VARCHAR', day: 'DATE', created: 'VARCHAR', whitelist_digest: 'VARCHAR', task_id: 'VARCHAR',
    language: 'VARCHAR', preferred_language: 'VARCHAR', region: 'VARCHAR'
}) WHERE {{table}} = 'reports';

INSERT INTO scalars SELECT * FROM read_json({{file}}, format = 'newline_delimited', columns = {
    report_id: 'VARCHAR', device: 'VARCHAR', day: 'DATE', key: 'VARCHAR', value: 'BIGINT'
}) WHERE {{table}} = 'scalars';

INSERT INTO distributions SELECT * FROM read_json({{file}}, format = 'newline_delimited', columns = {
    report_id: 'VARCHAR', device: 'VARCHAR', day: 'DATE', key: 'VARCHAR', count: 'BIGINT', minimum: 'DOUBLE', maximum: 'DOUBLE',
    mean: 'DOUBLE', m2: 'DOUBLE', finite: 'TINYINT'
}) WHERE {{table}} = 'distributions';

INSERT INTO histograms SELECT * FROM read_json({{file}}, format = 'newline_delimited', columns = {
    report_id: 'VARCHAR', device: 'VARCHAR', day: 'DATE', key: 'VARCHAR', lower: 'DOUBLE', upper: 'DOUBLE', count: 'BIGINT'
}) WHERE {{table}} = 'histograms';
