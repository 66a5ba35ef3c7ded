"""`ssoclient keep` as a service: its manager, and its metrics."""

import os
import signal
import socket
import unittest
import urllib.parse
import urllib.request

from expositions import parse
from keeping import DEADLINE, WRITTEN, KeepTest
from programs import USAGE, ssoclient

class NotifySocket:
    """What a service manager listens at."""

    def __init__(self, address):
        self.socket = socket.socket(socket.AF_UNIX, socket.SOCK_DGRAM)
        self.socket.settimeout(DEADLINE)
        self.socket.bind(address.replace("@", "\0", 1))

    def next(self):
        return self.socket.recv(4096).decode()

    def find(self, beginning):
        """The next message that begins so; those before it are of the watchdog."""
        while not (message := self.next()).startswith(beginning):
            assert message == "WATCHDOG=1", message
        return message


class Managed(KeepTest):
    def listen(self, address):
        manager = NotifySocket(address)
        self.addCleanup(manager.socket.close)
        return manager

    def assert_is_told(self, address):
        manager = self.listen(address)
        keeping = self.keep(environment={"NOTIFY_SOCKET": address})
        line = keeping.find(WRITTEN)[0]
        self.assertEqual("READY=1\nSTATUS=" + line[len("ssoclient: "):], manager.next())
        keeping.send(signal.SIGHUP)
        self.assertRegex(manager.next(), r"\ARELOADING=1\nMONOTONIC_USEC=\d+\Z")
        self.assertRegex(manager.next(), r"\AREADY=1\nSTATUS=a new token of ")
        self.write("password", "wrong\n")
        keeping.send(signal.SIGHUP)
        self.assertRegex(manager.next(), r"\ARELOADING=1\n")
        self.assertRegex(manager.next(), r"\AREADY=1\nSTATUS=InvalidCredentialsException: ")
        self.assert_ends(keeping)
        self.assertEqual("STOPPING=1", manager.next())

    def test_by_a_named_socket(self):
        self.assert_is_told(str(self.folder / "notify"))

    def test_by_an_abstract_socket(self):
        self.assert_is_told(f"@ssoclient-test-{os.getpid()}")

    def test_is_ready_with_the_first_token(self):
        self.write("password", "wrong\n")
        manager = self.listen(str(self.folder / "notify"))
        keeping = self.keep(environment={"NOTIFY_SOCKET": str(self.folder / "notify")})
        self.assertRegex(manager.next(), r"\ASTATUS=InvalidCredentialsException: ")
        keeping.send(signal.SIGHUP)
        self.assertRegex(manager.next(), r"\ASTATUS=InvalidCredentialsException: ")
        self.password.write_text("alice-secret\n")
        keeping.send(signal.SIGHUP)
        self.assertRegex(manager.next(), r"\AREADY=1\nSTATUS=a new token of ")
        self.assert_ends(keeping)

    def test_that_is_not_there_is_told_once(self):
        keeping = self.keep(environment={"NOTIFY_SOCKET": str(self.folder / "nobody")})
        keeping.find(WRITTEN)
        keeping.send(signal.SIGHUP)
        self.assertEqual("ssoclient: the service manager cannot be told: No such file or directory",
                         keeping.line())
        self.assertRegex(keeping.line(), WRITTEN)
        self.assertEqual([], self.assert_ends(keeping))

    def test_with_a_name_that_is_none(self):
        for variable, value, why in (
                ("NOTIFY_SOCKET", "relative", "is not the name of a local socket"),
                ("NOTIFY_SOCKET", "@", "is not the name of a local socket"),
                ("NOTIFY_SOCKET", "/" + 108 * "x", "is not the name of a local socket"),
                ("WATCHDOG_USEC", "0", "is not a positive number"),
                ("WATCHDOG_USEC", "soon", "is not a positive number")):
            with self.subTest(variable=variable, value=value):
                result = ssoclient("keep", self.file, *self.by_password,
                                   environment={**os.environ, variable: value})
                self.assert_fails(result, USAGE, "UsageError", f"{variable}: `{value}' {why}")


class Watched(KeepTest):
    def start(self, pid):
        address = str(self.folder / "notify")
        manager = NotifySocket(address)
        self.addCleanup(manager.socket.close)
        keeping = self.keep(
            launcher=["sh", "-c", f'WATCHDOG_PID={pid} exec "$0" "$@"'],
            environment={"NOTIFY_SOCKET": address, "WATCHDOG_USEC": "100000"})
        return manager, keeping

    def test_is_alive(self):
        manager, keeping = self.start("$$")
        keeping.find(WRITTEN)
        manager.find("READY=1")
        for _ in range(5):
            self.assertEqual("WATCHDOG=1", manager.next())
        self.assert_ends(keeping)

    def test_not_when_it_is_stopped(self):
        manager, keeping = self.start("$$")
        manager.find("READY=1")
        keeping.send(signal.SIGSTOP)
        manager.socket.settimeout(0.5)
        with self.assertRaises(TimeoutError):
            while manager.next() == "WATCHDOG=1":
                pass
        keeping.send(signal.SIGCONT)
        self.assertEqual("WATCHDOG=1", manager.next())
        self.assert_ends(keeping)

    def test_another_process_is(self):
        manager, keeping = self.start("1")
        keeping.find(WRITTEN)
        keeping.send(signal.SIGHUP)
        keeping.find(WRITTEN)
        self.assert_ends(keeping)
        self.assertEqual(
            ["READY=1", "RELOADING=1", "READY=1", "STOPPING=1"],
            [manager.next().split("\n", maxsplit=1)[0] for _ in range(4)])


class Metrics(KeepTest):
    def start(self, *options, address="127.0.0.1:0"):
        keeping = self.keep("--metrics", address, *options)
        self.url = keeping.find(r"metrics are at (http://\S+:[1-9]\d*/metrics)\Z")[1]
        return keeping

    def get(self):
        with urllib.request.urlopen(self.url, timeout=DEADLINE) as reply:
            self.assertEqual("text/plain; version=0.0.4; charset=utf-8",
                             reply.headers["Content-Type"])
            return parse(reply.read().decode("ascii"))

    def connect(self):
        place = urllib.parse.urlsplit(self.url)
        client = socket.create_connection((place.hostname, place.port), timeout=DEADLINE)
        self.addCleanup(client.close)
        return client

    def ask(self, request):
        with self.connect() as client:
            client.sendall(request)
            reply = b""
            while piece := client.recv(65536):
                reply += piece
        return reply.decode()

    def test_count(self):
        keeping = self.start("--lifetime", "1000")
        keeping.find(WRITTEN)
        samples = self.get()
        self.assertEqual((1, 1), (samples["ssoclient_keep_up"],
                                  samples["ssoclient_keep_refreshes_total"]))
        self.assertTrue(900 < samples["ssoclient_keep_token_validity_seconds"] <= 1000)
        since = self.file.stat().st_mtime
        self.assertAlmostEqual(since, samples["ssoclient_keep_last_success_timestamp_seconds"],
                               delta=5)
        self.write("password", "wrong\n")
        for _ in range(2):
            keeping.send(signal.SIGHUP)
            keeping.find("InvalidCredentialsException")
        self.write("password", "alice-secret\n")
        keeping.send(signal.SIGHUP)
        keeping.find(WRITTEN)
        samples = self.get()
        self.assertEqual(2, samples["ssoclient_keep_refreshes_total"])
        self.assertEqual(
            2, samples['ssoclient_keep_failures_total{class="InvalidCredentialsException"}'])
        self.assert_ends(keeping)

    def test_before_the_first_token(self):
        self.write("password", "wrong\n")
        keeping = self.start()
        keeping.find("InvalidCredentialsException")
        self.assertEqual(
            {"ssoclient_keep_up": 0, "ssoclient_keep_refreshes_total": 0,
             'ssoclient_keep_failures_total{class="InvalidCredentialsException"}': 1,
             "ssoclient_keep_token_validity_seconds": 0,
             "ssoclient_keep_last_success_timestamp_seconds": 0}, self.get())
        self.assert_ends(keeping)

    def test_are_all_that_can_be_asked_for(self):
        self.start()
        for request, status in (
                ("GET /metrics HTTP/1.1", "200 OK"), ("GET /metrics HTTP/1.0", "200 OK"),
                ("GET /metrics?name[]=x HTTP/1.1", "200 OK"),
                ("GET / HTTP/1.1", "404 Not Found"), ("GET /metricsx HTTP/1.1", "404 Not Found"),
                ("GET /metrics/ HTTP/1.1", "404 Not Found"),
                ("GET /../metrics HTTP/1.1", "404 Not Found"),
                ("POST / HTTP/1.1", "404 Not Found"),
                ("POST /metrics HTTP/1.1", "405 Method Not Allowed"),
                ("HEAD /metrics HTTP/1.1", "405 Method Not Allowed"),
                ("get /metrics HTTP/1.1", "405 Method Not Allowed"),
                ("GET /metrics", "400 Bad Request"), ("GET /metrics HTTP/2", "400 Bad Request"),
                ("", "400 Bad Request"), (" ", "400 Bad Request"),
                ("\x00\xff", "400 Bad Request")):
            with self.subTest(request=request):
                reply = self.ask(f"{request}\r\nHost: x\r\n\r\n".encode("latin-1"))
                self.assertEqual(f"HTTP/1.1 {status}", reply.split("\r\n")[0])
                head, _, body = reply.partition("\r\n\r\n")
                self.assertIn(f"\r\nContent-Length: {len(body)}", head)
                self.assertEqual("405" in status, "\r\nAllow: GET\r\n" in head)

    def test_come_whole_although_more_was_sent(self):
        self.start()
        reply = self.ask(b"POST /metrics HTTP/1.1\r\nContent-Length: 100000\r\n\r\n" + b"x" * 100000)
        self.assertTrue(reply.endswith("405 Method Not Allowed\n"))

    def test_of_a_request_that_comes_in_pieces(self):
        keeping = self.start()
        keeping.find(WRITTEN)
        with self.connect() as client:
            for octet in b"GET /metrics HTTP/1.1\r\nHost: x\r\n\r":
                client.sendall(bytes([octet]))
            client.sendall(b"\n")
            self.assertTrue(client.recv(65536).startswith(b"HTTP/1.1 200 OK\r\n"))

    def test_are_refused_to_whoever_sends_too_much(self):
        self.start()
        reply = self.ask(b"GET /metrics HTTP/1.1\r\nX: " + b"x" * 9000)
        self.assertTrue(reply.startswith("HTTP/1.1 431 "))

    def test_are_there_beside_many_who_say_nothing(self):
        keeping = self.start()
        keeping.find(WRITTEN)
        for _ in range(100):
            self.connect().sendall(b"GET /metrics HTTP/1.1\r\n")
        self.assertEqual(1, self.get()["ssoclient_keep_up"])
        descriptors = os.listdir(f"/proc/{keeping.process.pid}/fd")
        self.assertLess(len(descriptors), 50)
        keeping.send(signal.SIGHUP)
        keeping.find(WRITTEN)

    def test_are_not_waited_for_for_ever(self):
        self.start()
        silent = self.connect()
        dripping = self.connect()
        dripping.sendall(b"GET /metrics")
        self.assertEqual(b"", silent.recv(1))
        self.assertEqual(b"", dripping.recv(1))

    def test_of_another_loopback_address(self):
        for address in ("localhost:0", "127.0.0.2:0", "[::1]:0"):
            with self.subTest(address=address):
                keeping = self.start(address=address)
                keeping.find(WRITTEN)
                self.assertEqual(1, self.get()["ssoclient_keep_up"])
                self.assert_ends(keeping)

    def test_of_any_address_on_request(self):
        keeping = self.start("--metrics-anywhere", address="0.0.0.0:0")
        keeping.find(WRITTEN)
        self.assertEqual(1, self.get()["ssoclient_keep_up"])
        self.assert_ends(keeping)

    def test_at_a_port_that_is_taken(self):
        with socket.create_server(("127.0.0.1", 0)) as other:
            result = ssoclient("keep", self.file, *self.by_password, "--metrics",
                               f"127.0.0.1:{other.getsockname()[1]}")
        self.assert_fails(result, USAGE, "UsageError",
                          "--metrics: cannot listen: Address already in use")


if __name__ == "__main__":
    unittest.main()
