"""A viewer that a test starts, and requests to it that no browser would send."""

import http.client
import json
import os
import pathlib
import re
import signal
import subprocess
import sys

sys.path.insert(0, str(pathlib.Path(__file__).parent.parent / "host"))

from support import VEXG  # noqa: E402


class Viewer:
    """A viewer of some files. It ends with the context."""

    def __init__(self, *arguments):
        self.process = subprocess.Popen([VEXG, "view", "--no-browser", *map(str, arguments)],
                                        stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True)
        self.address = self.process.stdout.readline().strip()
        found = re.fullmatch(r"http://127\.0\.0\.1:(\d+)/#([0-9a-f]{32})", self.address)
        if not found:
            self.process.kill()
            raise AssertionError(f"{self.address!r}: {self.process.communicate()[1]}")
        self.port, self.key = int(found[1]), found[2]
        self.host = f"127.0.0.1:{self.port}"

    def ask(self, path, method="GET", headers=None, body=None, key=True, host=None):
        """Status, headers and body of an answer. A header whose value is None is left out."""
        connection = http.client.HTTPConnection("127.0.0.1", self.port, timeout=20)
        try:
            connection.putrequest(method, path, skip_host=True, skip_accept_encoding=True)
            sent = {"Host": host or self.host, **({"X-Vexg-Key": self.key} if key else {}), **(headers or {})}
            if body is not None:
                sent.setdefault("Content-Length", str(len(body)))
            for name, value in sent.items():
                if value is not None:
                    connection.putheader(name, value)
            connection.endheaders(body)
            answer = connection.getresponse()
            return answer.status, dict(answer.getheaders()), answer.read()
        finally:
            connection.close()

    def get(self, path):
        """The JSON of a good answer."""
        status, _, body = self.ask(f"/api/{path}")
        assert status == 200, (status, body)
        return json.loads(body)

    def post(self, path, value):
        status, _, body = self.ask(f"/api/{path}", "POST", body=json.dumps(value).encode())
        assert status == 200, (status, body)
        return json.loads(body)

    def memory(self):
        """Bytes of memory that the process has."""
        with open(f"/proc/{self.process.pid}/statm") as statm:
            return int(statm.read().split()[1]) * os.sysconf("SC_PAGE_SIZE")

    def end(self, number=signal.SIGINT):
        """The exit code after a signal, and what it said."""
        self.process.send_signal(number)
        _, said = self.process.communicate(timeout=20)
        return self.process.returncode, said

    def __enter__(self):
        return self

    def __exit__(self, *_):
        if self.process.poll() is None:
            self.process.terminate()
        try:
            self.process.communicate(timeout=20)
        except subprocess.TimeoutExpired:
            self.process.kill()
            self.process.communicate()
