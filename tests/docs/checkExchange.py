# SPDX-License-Identifier: Apache-2.0
# Copyright the Quorlin authors

"""The exchanges in docs/wire-format.md are what the command-line tool and the development token service say to each other.

The tool is run through a relay that keeps what passes. A block of the page that has a line <!-- wire: NAME PART --> before it is
compared with PART (head, request or answer) of the exchange NAME; with the word "excerpt" after PART it has to stand in there. The
page may fold lines, indent, and add comments; dates, UUIDs, lengths and base64 values differ from one exchange to the next.

usage: checkExchange.py QUORLIN [--print]
"""

import hashlib
import http.client
import json
import re
import ssl
import subprocess
import sys
import tempfile
import threading
from http.server import BaseHTTPRequestHandler, ThreadingHTTPServer
from pathlib import Path

from pages import Page, finish, read_root

MARK = re.compile(r"<!-- wire: (\S+) (\S+)( excerpt)? -->")
BASE64_ELEMENTS = "DigestValue|SignatureValue|X509Certificate|BinarySecurityToken"
MASKS = (
    (re.compile(r"\d{4}-\d\d-\d\dT[\d:.]+Z"), "DATE"),
    (re.compile(r"[0-9a-f]{8}(-[0-9a-f]{4}){3}-[0-9a-f]{12}"), "UUID"),
    (re.compile(r"127\.0\.0\.1:\d+"), "HOST"),
    (re.compile(r"(Content-Length: )\d+"), r"\1N"),
    (re.compile(rf"(<(?:\w+:)?(?:{BASE64_ELEMENTS})\b[^>]*>)[^<]*"), r"\1BASE64"),
)


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
    """A running service, the relay before it, and a client with a key that the service knows."""

    def __init__(self, program, folder):
        self._program = program
        self._folder = Path(folder)
        self._make_identity()
        command = [program, "sts", "--http", "--directory", self._path("users.json"), "--write-certs", folder]
        self._sts = subprocess.Popen(command, stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, text=True)
        url = json.loads(self._sts.stdout.readline())["url"]
        host, port = re.match(r"http://([\d.]+):(\d+)/", url).groups()
        self._relay = Relay((host, int(port)))
        threading.Thread(target=self._relay.serve_forever, daemon=True).start()

    def _path(self, name):
        return str(self._folder / name)

    def _make_identity(self):
        command = ["openssl", "req", "-x509", "-newkey", "rsa:2048", "-nodes", "-subj", "/CN=robot", "-days", "2"]
        command += ["-keyout", self._path("key.pem"), "-out", self._path("cert.pem")]
        subprocess.run(command, check=True, stderr=subprocess.DEVNULL)
        der = ssl.PEM_cert_to_DER_cert((self._folder / "cert.pem").read_text(encoding="utf-8"))
        alice = {"name": "alice", "domain": "example.com", "password": "secret", "givenName": "Alice", "surname": "Example"}
        alice["groups"] = [{"name": "Staff", "domain": "example.com", "form": "backslash"}]
        robot = {"name": "robot", "domain": "example.com", "certificates": [hashlib.sha256(der).hexdigest()]}
        (self._folder / "users.json").write_text(json.dumps({"users": [alice, robot]}), encoding="utf-8")

    def run(self, arguments, text="", code=0):
        """Runs the tool, and returns the parts of the exchange."""
        command = [self._program, *arguments, "--url", f"http://127.0.0.1:{self._relay.server_port}/sts"]
        command += ["--sts-cert", self._path("sts.pem")]
        result = subprocess.run(command, input=text, capture_output=True, text=True, check=False)
        if result.returncode != code:
            sys.exit(f"{' '.join(arguments)}: {result.returncode}: {result.stderr}")
        return self._relay.parts

    def run_all(self):
        alice = ["acquire", "password", "--user", "alice@example.com", "--password-stdin"]
        robot = ["--cert", self._path("cert.pem"), "--key", self._path("key.pem")]
        token = self._path("token.xml")
        return {
            "password": self.run([*alice, "--out", token], "secret\n"),
            "certificate": self.run(["acquire", "certificate", "--renewable", *robot]),
            "validate": self.run(["validate", "--token", token]),
            "refused": self.run(alice, "wrong\n", 1),
        }

    def stop(self):
        self._relay.shutdown()
        self._sts.terminate()
        self._sts.wait()


def normalise(text):
    """The text without XML declaration, comments, layout, and what changes from one exchange to the next."""
    text = re.sub(r"<!--.*?-->|<\?xml.*?\?>", "", text, flags=re.DOTALL)
    text = re.sub(r">\s+<", "><", text.strip())
    text = re.sub(r"\s+", " ", text)
    for pattern, mask in MASKS:
        text = pattern.sub(mask, text)
    return re.sub(r" (/?>)", r"\1", text)


def fold(line):
    """A long start tag with each attribute on a line of its own."""
    if len(line) <= 110:
        return line
    indent = " " * (len(line) - len(line.lstrip()) + 4)
    start, end, rest = line.partition(">")
    return re.sub(r" ([\w:]+=\")", rf"\n{indent}\1", start) + end + rest


def lay_out(text):
    """XML for the eyes: one element a line, base64 cut short."""
    text = re.sub(r"^<\?xml.*?\?>\s*", "", text)
    text = re.sub(rf"(<(?:\w+:)?(?:{BASE64_ELEMENTS})\b[^>]*>)([^<]{{24}})[^<]*", r"\1\2…", text)
    depth = 0
    lines = []
    for piece in re.sub(r"><", ">\n<", text).split("\n"):
        closes = piece.startswith("</")
        depth -= closes
        lines.append(fold("  " * depth + piece))
        opens = piece.startswith("<") and not closes and not piece.endswith("/>") and "</" not in piece
        depth += opens
    return "\n".join(lines)


def compare(page, exchanges):
    faults = []
    count = 0
    for block in page.blocks:
        mark = MARK.fullmatch(block.before)
        if not mark:
            continue
        count += 1
        expected = normalise(block.text)
        actual = normalise(exchanges[mark.group(1)][mark.group(2)])
        if expected != actual and not (mark.group(3) and expected in actual):
            faults.append(f"{block}: is not what was said. The page has\n{expected}\nand the wire\n{actual}")
    finish(faults, f"{count} texts of {len(exchanges)} exchanges")


def main():
    with tempfile.TemporaryDirectory() as folder:
        world = World(sys.argv[1], folder)
        try:
            exchanges = world.run_all()
        finally:
            world.stop()
    if "--print" in sys.argv:
        for name, parts in exchanges.items():
            for part, text in parts.items():
                print(f"<!-- wire: {name} {part} -->\n\n{lay_out(text) if part != 'head' else text}\n")
        return
    root = read_root()
    compare(Page(root, root / "docs" / "wire-format.md"), exchanges)


main()
