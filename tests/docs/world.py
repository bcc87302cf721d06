# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""A running development token service, a relay before it that keeps what passes, and a client with a key that it knows."""

import hashlib
import http.client
import json
import re
import ssl
import subprocess
import sys
import threading
from http.server import BaseHTTPRequestHandler, ThreadingHTTPServer
from pathlib import Path


class Relay(ThreadingHTTPServer):
    """Passes requests on to the service, and keeps the last exchange."""

    def __init__(self, address):
        super().__init__(("127.0.0.1", 0), RelayHandler)
        self.service = address
        self.parts = {}


class RelayHandler(BaseHTTPRequestHandler):
    protocol_version = "HTTP/1.1"

    def do_POST(self):
        body = self.rfile.read(int(self.headers["Content-Length"]))
        connection = http.client.HTTPConnection(*self.server.service)
        connection.request("POST", self.path, body, dict(self.headers))
        answer = connection.getresponse()
        text = answer.read()
        head = "".join(f"{name}: {value}\n" for name, value in self.headers.items())
        self.server.parts = {
            "head": f"{self.requestline}\n{head}",
            "request": body.decode(),
            "answer": text.decode(),
        }
        self.send_response(answer.status)
        self.send_header("Content-Type", answer.getheader("Content-Type"))
        self.send_header("Content-Length", str(len(text)))
        self.end_headers()
        self.wfile.write(text)

    def log_message(self, *_):
        pass


class World:
    """The whole; it ends with its context."""

    def __init__(self, program, folder):
        self._program = program
        self._folder = Path(folder)
        self._make_identity()
        command = [program, "sts", "--http", "--directory", self.path("users.json"), "--write-certs", folder]
        self._sts = subprocess.Popen(command, stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, text=True)
        url = json.loads(self._sts.stdout.readline())["url"]
        host, port = re.match(r"http://([\d.]+):(\d+)/", url).groups()
        self._relay = Relay((host, int(port)))
        threading.Thread(target=self._relay.serve_forever, daemon=True).start()

    def path(self, name):
        return str(self._folder / name)

    def _make_identity(self):
        command = ["openssl", "req", "-x509", "-newkey", "rsa:2048", "-nodes", "-subj", "/CN=robot", "-days", "2"]
        command += ["-keyout", self.path("key.pem"), "-out", self.path("cert.pem")]
        subprocess.run(command, check=True, stderr=subprocess.DEVNULL)
        der = ssl.PEM_cert_to_DER_cert((self._folder / "cert.pem").read_text(encoding="utf-8"))
        alice = {"name": "alice", "domain": "example.com", "password": "secret", "givenName": "Alice", "surname": "Example"}
        alice["groups"] = [{"name": "Staff", "domain": "example.com", "form": "backslash"}]
        robot = {"name": "robot", "domain": "example.com", "certificates": [hashlib.sha256(der).hexdigest()]}
        (self._folder / "users.json").write_text(json.dumps({"users": [alice, robot]}), encoding="utf-8")

    def run_tool(self, arguments, text="", code=0):
        """Runs the tool, and returns what it prints."""
        result = subprocess.run([self._program, *arguments], input=text, capture_output=True, text=True, check=False)
        if result.returncode != code:
            sys.exit(f"{' '.join(arguments)}: {result.returncode}: {result.stderr}")
        return result.stdout

    def ask(self, arguments, text="", code=0):
        """Runs a command that asks the service, and returns what it prints. The exchange is then in `parts`."""
        url = f"http://127.0.0.1:{self._relay.server_port}/sts"
        return self.run_tool([*arguments, "--url", url, "--sts-cert", self.path("sts.pem")], text, code)

    @property
    def parts(self):
        """The head and the text of the last request, and the text of its answer."""
        return self._relay.parts

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self._relay.shutdown()
        self._sts.terminate()
        self._sts.wait()
