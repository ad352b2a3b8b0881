// Runs SQL in a DuckDB of its own, in memory: a JSON text with the SQL a line on standard input, an array of rows, or
// {"error": text}, a line on standard output. Numbers wider than 53 bits are texts.
const readline = require("readline");
const { DuckDBInstance } = require("@duckdb/node-api");

async function answer(connection, sql) {
  const statements = await connection.extractStatements(sql);
  let rows = [];
  for (let place = 0; place < statements.count; ++place) {
    const statement = await statements.prepare(place);
    rows = await (await statement.run()).getRowObjectsJson();
  }
  return rows;
}

async function main() {
  const connection = await (await DuckDBInstance.create(":memory:")).connect();
  for await (const line of readline.createInterface({ input: process.stdin })) {
    const said = await answer(connection, JSON.parse(line)).catch((error) => ({ error: error.message }));
    process.stdout.write(JSON.stringify(said) + "\n");
  }
}

main();
