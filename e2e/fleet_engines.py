"""Engines that answer the queries of fleet/, each in a folder of its own and for as long as a `with` lasts.

    with ClickHouseCluster() as cluster, PostgreSQL() as postgresql, DuckDB() as duckdb:
        for engine in (cluster, postgresql, duckdb):
            engine.make_tables()
            engine.load("scalars", "scalars.tsv")     # DuckDB: a file of JSON lines; engine.form says which
            rows = engine.ask("scalar", key="k", first="2026-11-01", last="2026-11-30", devices="1")

Rows are dictionaries of texts by the names of the columns. What an engine refuses is an EngineError with its words. Servers listen on
loopback ports that were free, or on a socket in their folder; they end with this process, however it ends.
"""

import contextlib
import csv
import io
import json
import os
import pathlib
import pwd
import shutil
import socket
import subprocess
import tempfile
import time

TREE = pathlib.Path(__file__).resolve().parent.parent
FLEET = TREE / "fleet"
QUIET_SECONDS = 60  # that a server may take until it answers
PATIENCE = 300  # seconds for a question or a load


class EngineError(Exception):
    """What the engine said."""


def filled(engine, name, **parameters):
    """The text of a file of fleet/ENGINE with its parameters."""
    words = [f"{parameter}={value}" for parameter, value in parameters.items()]
    done = subprocess.run([FLEET / "fill", FLEET / engine / f"{name}.sql", *words], capture_output=True)
    if done.returncode != 0:
        raise EngineError(done.stderr.decode())
    return done.stdout.decode()


def said_by(command, **options):
    done = subprocess.run(command, capture_output=True, timeout=PATIENCE, **options)
    if done.returncode != 0:
        raise EngineError(done.stderr.decode(errors="replace"))
    return done.stdout.decode()


def free_ports(count):
    with contextlib.ExitStack() as taken:
        sockets = [taken.enter_context(socket.socket()) for _ in range(count)]
        for one in sockets:
            one.bind(("127.0.0.1", 0))
        return [one.getsockname()[1] for one in sockets]


class Engine:
    """What the engines have in common: a folder, processes, and the files of fleet/."""

    name = ""    # of its folder in fleet/
    form = "tsv"  # of the rows that it loads
    weeks = False  # whether `ask` asks the weeks in place of the days

    def __enter__(self):
        self.folder = pathlib.Path(tempfile.mkdtemp(prefix=f"tbdaily-{self.name}-"))
        self.processes = {}
        try:
            self.start()
        except BaseException:
            self.__exit__()
            raise
        return self

    def __exit__(self, *_):
        for key in list(self.processes):
            self.end(key)
        shutil.rmtree(self.folder, ignore_errors=True)

    def run(self, key, command, how=(), **options):
        """A process that gets SIGTERM when this one ends; `how`: words for setpriv."""
        self.processes[key] = subprocess.Popen(["setpriv", *how, "--pdeathsig", "TERM", *map(str, command)],
                                               cwd=self.folder, **options)

    def end(self, key):
        process = self.processes.pop(key)
        process.terminate()
        try:
            process.wait(20)
        except subprocess.TimeoutExpired:
            process.kill()
            process.wait()

    def wait_for(self, key, answers):
        """Whether the process answers; False where it ended."""
        deadline = time.monotonic() + QUIET_SECONDS
        while self.processes[key].poll() is None and time.monotonic() < deadline:
            with contextlib.suppress(EngineError):
                answers()
                return True
            time.sleep(0.1)
        return False

    def ask(self, query, **parameters):
        return self.rows(filled(self.name, query, **parameters))


class ClickHouseCluster(Engine):
    """Servers that make up the cluster `fleet`, a shard each."""

    name = "clickhouse"

    def __init__(self, servers=2):
        self.servers = range(servers)

    def start(self):
        for _ in range(3):  # somebody else may take a port before its server does
            ports = iter(free_ports(3 * len(self.servers)))
            self.ports = {server: [next(ports) for _ in range(3)] for server in self.servers}
            if all([self.start_server(server) for server in self.servers]):
                return
            for server in self.servers:
                self.stop_server(server)
        raise EngineError("\n".join(log.read_text(errors="replace") for log in self.folder.glob("*/errors")))

    def start_server(self, server):
        """Starts a server on what it has; whether it answers."""
        folder = self.folder / str(server)
        folder.mkdir(exist_ok=True)
        tcp, http, replication = self.ports[server]
        shards = "".join(f"<shard><replica><host>127.0.0.1</host><port>{ports[0]}</port></replica></shard>"
                         for ports in self.ports.values())
        (folder / "users.xml").write_text(
            "<yandex><profiles><default/></profiles><quotas><default/></quotas><users><default><password/><profile>default</profile>"
            "<quota>default</quota><networks><ip>127.0.0.1</ip></networks></default></users></yandex>")
        (folder / "config.xml").write_text(
            f"<yandex><logger><level>warning</level><log>{folder}/log</log><errorlog>{folder}/errors</errorlog></logger>"
            f"<listen_host>127.0.0.1</listen_host><tcp_port>{tcp}</tcp_port><http_port>{http}</http_port>"
            f"<interserver_http_host>127.0.0.1</interserver_http_host><interserver_http_port>{replication}</interserver_http_port>"
            f"<path>{folder}/data/</path><tmp_path>{folder}/tmp/</tmp_path><users_config>users.xml</users_config>"
            "<default_profile>default</default_profile><default_database>default</default_database>"
            f"<mark_cache_size>100000000</mark_cache_size><remote_servers><fleet>{shards}</fleet></remote_servers></yandex>")
        self.run(server, ["clickhouse-server", f"--config-file={folder}/config.xml"], stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
        return self.wait_for(server, lambda: self.said("SELECT 1", server))

    def stop_server(self, server):
        self.end(server)

    def said(self, sql, server=0, words=(), **options):
        """What a server prints; each sees the tables of all."""
        return said_by(["clickhouse-client", "--host", "127.0.0.1", "--port", str(self.ports[server][0]), *words, "--query", sql], **options)

    def make_tables(self):
        for server in self.servers:
            self.said(filled(self.name, "schema"), server, ["--multiquery"])

    def roll(self, week):
        self.said(filled(self.name, "week", week=week), words=["--multiquery", "--insert_distributed_sync=1"])

    def drop_days(self, tables):
        for server in self.servers:
            for table in tables:
                self.said(f"TRUNCATE TABLE {table}_local", server)

    def load(self, table, file):
        """Into whichever server: rows go where they belong, and are there when it returns."""
        with open(file, "rb") as rows:
            self.said(filled(self.name, "load", table=table), words=["--insert_distributed_sync=1"], stdin=rows)

    def rows(self, sql, server=0):
        names, *rows = [line.split("\t") for line in
                        self.said(sql, server, ["--format", "TabSeparatedWithNames", "--database", "weeks" if self.weeks else "default"]).split("\n")[:-1]] or [[]]
        return [dict(zip(names, map(unescaped, row), strict=True)) for row in rows]


def unescaped(text):
    """A field as it was before it was written tab-separated."""
    letters = {"t": "\t", "n": "\n", "r": "\r", "b": "\b", "f": "\f", "0": "\0"}
    parts = iter(text.split("\\"))
    plain = next(parts)
    for part in parts:
        plain += letters.get(part[0], part[0]) + part[1:] if part else "\\" + next(parts, "")
    return plain


class PostgreSQL(Engine):
    """One server, on a socket in its folder; queries are asked by a role without special rights."""

    name = "postgresql"

    def start(self):
        # It does not run as root.
        user = pwd.getpwnam("postgres") if os.geteuid() == 0 else pwd.getpwuid(os.geteuid())
        how = [f"--reuid={user.pw_uid}", f"--regid={user.pw_gid}", "--clear-groups"] if os.geteuid() == 0 else []
        os.chown(self.folder, user.pw_uid, user.pw_gid)
        programs = max(pathlib.Path("/usr/lib/postgresql").glob("*/bin"), key=lambda folder: int(folder.parent.name))
        said_by(["setpriv", *how, programs / "initdb", "-D", self.folder / "data", "-A", "trust", "-U", "owner", "--locale=C",
                 "--encoding=UTF8", "-N"], cwd=self.folder)
        settings = {"listen_addresses": "", "unix_socket_directories": self.folder, "unix_socket_permissions": "0700", "fsync": "off",
                    "max_connections": "10", "timezone": "UTC"}
        words = [word for name, value in settings.items() for word in ("-c", f"{name}={value}")]
        with open(self.folder / "log", "wb") as log:
            self.run("server", [programs / "postgres", "-D", self.folder / "data", *words], how, stdout=log, stderr=log)
        if not self.wait_for("server", lambda: self.said("SELECT 1", "owner", "postgres")):
            raise EngineError((self.folder / "log").read_text(errors="replace"))
        self.said("CREATE ROLE analyst LOGIN", "owner", "postgres")
        self.said("CREATE DATABASE fleet OWNER analyst", "owner", "postgres")

    def said(self, sql, role="analyst", database="fleet", words=(), **options):
        return said_by(["psql", "-X", "-q", "-v", "ON_ERROR_STOP=1", "-h", self.folder, "-U", role, "-d", database, *words, "-c", sql],
                       **options)

    def make_tables(self):
        self.said(filled(self.name, "schema"))

    def load(self, table, file):
        with open(file, "rb") as rows:
            self.said(filled(self.name, "load", table=table), stdin=rows)

    def rows(self, sql):
        path = "SET search_path = weeks, public;" if self.weeks else ""
        return list(csv.DictReader(io.StringIO(self.said(path + sql, words=["--csv"]), newline="")))

    def roll(self, week):
        self.said(filled(self.name, "week", week=week))

    def drop_days(self, tables):
        self.said(f"TRUNCATE {', '.join(tables)}")


class DuckDB(Engine):
    """Within a process of Node.js that has @duckdb/node-api below NODE_PATH."""

    name = "duckdb"
    form = "ndjson"

    def start(self):
        self.run("node", ["node", TREE / "e2e" / "fleet_duckdb.js"], stdin=subprocess.PIPE, stdout=subprocess.PIPE, text=True)

    def end(self, key):
        process = self.processes[key]
        super().end(key)
        process.stdin.close()
        process.stdout.close()

    def rows(self, sql):
        process = self.processes["node"]
        process.stdin.write(json.dumps(sql) + "\n")
        process.stdin.flush()
        answer = json.loads(process.stdout.readline() or '{"error": "it ended"}')
        if isinstance(answer, dict):
            raise EngineError(answer["error"])
        return [{name: str(value) for name, value in row.items()} for row in answer]

    def make_tables(self):
        self.rows(filled(self.name, "schema"))

    def load(self, table, file):
        self.rows(filled(self.name, "load", table=table, file=file))

    def ask(self, query, **parameters):
        self.rows(f"USE {'weeks' if self.weeks else 'main'}")
        return super().ask(query, **parameters)

    def roll(self, week):
        self.rows(filled(self.name, "week", week=week))

    def drop_days(self, tables):
        self.rows("".join(f"DELETE FROM main.{table};" for table in tables))
