#!/usr/bin/env python3
"""Loopback HTTP front for the sample MapServer.

Serves /wms and /wcs (map "world"), /wms111 (the same map behaving like a server that
speaks WMS 1.1.1 only) and /wms4326 (map "wgs84") by running mapserv once per request as CGI and passing its answer
back unchanged. Also keeps a request log for tests:
  GET  /__stats  -> {"requests": N, "log": ["GET /wms?...", ...]}  (last 200 lines)
  POST /__reset  -> clears the counter and the log
Binds to 127.0.0.1 only; stops on SIGTERM or SIGINT.
"""

import argparse
import collections
import http.server
import json
import os
import signal
import subprocess
import sys
import threading
import urllib.parse

ROOT = os.path.dirname(os.path.dirname(os.path.abspath(__file__)))
MAPSERV_PATHS = ("/usr/bin/mapserv", "/usr/lib/cgi-bin/mapserv")
# Request path -> map served there (DATA/<map>.conf names its mapfile).
SERVICE_MAPS = {"/wms": "world", "/wcs": "world", "/wms111": "world", "/wms4326": "wgs84"}
LOG_LENGTH = 200
MAPSERV_TIMEOUT = 60


class Stats:
    def __init__(self):
        self.lock = threading.Lock()
        self.count = 0
        self.log = collections.deque(maxlen=LOG_LENGTH)

    def add(self, line):
        with self.lock:
            self.count += 1
            self.log.append(line)

    def snapshot(self):
        with self.lock:
            return {"requests": self.count, "log": list(self.log)}

    def reset(self):
        with self.lock:
            self.count = 0
            self.log.clear()


def only_wms111(query):
    """Makes a GetCapabilities request ask for 1.1.1, as a server knowing no later version
    answers any version with its own."""
    params = urllib.parse.parse_qsl(query, keep_blank_values=True)
    if not any(k.lower() == "request" and v.lower() == "getcapabilities" for k, v in params):
        return query
    params = [(k, v) for k, v in params if k.lower() not in ("version", "wmtver")]
    params.append(("VERSION", "1.1.1"))
    return urllib.parse.urlencode(params)


def split_cgi_output(out):
    """Splits a CGI answer into (status, reason, [(name, value)], body)."""
    end = out.find(b"\r\n\r\n")
    sep = 4
    lf = out.find(b"\n\n")
    if lf != -1 and (end == -1 or lf < end):
        end, sep = lf, 2
    if end == -1:
        return 502, "Bad Gateway", [("Content-Type", "text/plain")], b"mapserv sent no CGI header\n"
    status, reason, headers = 200, "OK", []
    for raw in out[:end].split(b"\n"):
        line = raw.rstrip(b"\r").decode("latin-1")
        if not line or ":" not in line:
            continue
        name, value = line.split(":", 1)
        name, value = name.strip(), value.strip()
        if name.lower() == "status":
            code, _, text = value.partition(" ")
            status, reason = int(code), (text or "")
        else:
            headers.append((name, value))
    return status, reason, headers, out[end + sep:]


class Handler(http.server.BaseHTTPRequestHandler):
    protocol_version = "HTTP/1.1"
    server_version = "sample-services/1"

    def log_message(self, fmt, *args):
        if self.server.verbose:
            super().log_message(fmt, *args)

    def send_bytes(self, status, content_type, body, reason=None, extra=()):
        self.send_response(status, reason)
        if content_type is not None:
            self.send_header("Content-Type", content_type)
        for name, value in extra:
            self.send_header(name, value)
        self.send_header("Content-Length", str(len(body)))
        self.end_headers()
        if self.command != "HEAD":
            self.wfile.write(body)

    def read_body(self):
        length = int(self.headers.get("Content-Length") or 0)
        return self.rfile.read(length) if length > 0 else b""

    def handle_any(self):
        path, _, query = self.path.partition("?")
        if path == "/__stats" and self.command == "GET":
            body = json.dumps(self.server.stats.snapshot()).encode()
            return self.send_bytes(200, "application/json", body)
        if path == "/__reset" and self.command == "POST":
            self.read_body()
            self.server.stats.reset()
            return self.send_bytes(200, "application/json", b'{"requests": 0}')
        body = self.read_body() if self.command == "POST" else b""
        if path not in SERVICE_MAPS:
            return self.send_bytes(404, "text/plain", b"not found\n")
        self.server.stats.add("%s %s" % (self.command, self.path))
        self.run_mapserv(path, query, body)

    def run_mapserv(self, path, query, body):
        if path == "/wms111":
            query = only_wms111(query)
        port = str(self.server.server_address[1])
        env = {
            "PATH": os.environ.get("PATH", "/usr/bin:/bin"),
            "GATEWAY_INTERFACE": "CGI/1.1",
            "SERVER_PROTOCOL": "HTTP/1.1",
            "SERVER_SOFTWARE": self.server_version,
            "REQUEST_METHOD": "GET" if self.command == "HEAD" else self.command,
            "QUERY_STRING": query,
            "SERVER_NAME": "127.0.0.1",
            "SERVER_PORT": port,
            "HTTP_HOST": "127.0.0.1:" + port,
            "SCRIPT_NAME": path,
            "REMOTE_ADDR": self.client_address[0],
            "MAPSERVER_CONFIG_FILE": os.path.join(self.server.data, SERVICE_MAPS[path] + ".conf"),
            "PROJ_NETWORK": "OFF",
        }
        if self.command == "POST":
            env["CONTENT_TYPE"] = self.headers.get("Content-Type", "application/octet-stream")
            env["CONTENT_LENGTH"] = str(len(body))
        try:
            proc = subprocess.run([self.server.mapserv], input=body, env=env,
                                  stdout=subprocess.PIPE, stderr=subprocess.PIPE,
                                  timeout=MAPSERV_TIMEOUT, check=False)
        except subprocess.TimeoutExpired:
            return self.send_bytes(504, "text/plain", b"mapserv timed out\n")
        if proc.stderr and self.server.verbose:
            sys.stderr.write(proc.stderr.decode("utf-8", "replace"))
        status, reason, headers, payload = split_cgi_output(proc.stdout)
        self.send_response(status, reason or None)
        for name, value in headers:
            if name.lower() not in ("content-length", "connection", "transfer-encoding"):
                self.send_header(name, value)
        self.send_header("Content-Length", str(len(payload)))
        self.end_headers()
        if self.command != "HEAD":
            self.wfile.write(payload)

    do_GET = handle_any
    do_POST = handle_any
    do_HEAD = handle_any


class Server(http.server.ThreadingHTTPServer):
    daemon_threads = True
    allow_reuse_address = True


def find_mapserv():
    for p in MAPSERV_PATHS:
        if os.access(p, os.X_OK):
            return p
    sys.exit("sample-services: mapserv not found (install cgi-mapserver)")


def write_atomically(path, text):
    tmp = path + ".tmp"
    with open(tmp, "w") as f:
        f.write(text)
    os.replace(tmp, path)


def main():
    ap = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    ap.add_argument("--port", type=int, default=0, help="port on 127.0.0.1 (0: pick a free one)")
    ap.add_argument("--data", default=os.path.join(ROOT, "build", "samples"),
                    help="sample data directory (generated when missing)")
    ap.add_argument("--port-file", help="write the port here once listening")
    ap.add_argument("--pid-file", help="write the process id here")
    ap.add_argument("--verbose", action="store_true", help="log requests and mapserv errors")
    args = ap.parse_args()

    data = os.path.abspath(args.data)
    config = os.path.join(data, "world.conf")
    # The generator is idempotent, so running it each start also refreshes stale data.
    subprocess.run(["bash", os.path.join(ROOT, "scripts", "make-sample-data.sh"), data], check=True)
    if not os.path.isfile(config):
        sys.exit("sample-services: %s missing after generation" % config)

    server = Server(("127.0.0.1", args.port), Handler)
    server.stats = Stats()
    server.mapserv = find_mapserv()
    server.data = data
    server.verbose = args.verbose

    def stop(_signum, _frame):
        threading.Thread(target=server.shutdown, daemon=True).start()

    signal.signal(signal.SIGTERM, stop)
    signal.signal(signal.SIGINT, stop)

    port = server.server_address[1]
    if args.pid_file:
        write_atomically(args.pid_file, "%d\n" % os.getpid())
    if args.port_file:
        write_atomically(args.port_file, "%d\n" % port)
    print("sample-services: http://127.0.0.1:%d/wms (data %s)" % (port, data), flush=True)
    try:
        server.serve_forever(poll_interval=0.2)
    finally:
        server.server_close()
        for f in (args.port_file, args.pid_file):
            if f:
                try:
                    os.remove(f)
                except OSError:
                    pass


if __name__ == "__main__":
    main()
