"""A service that says what a test tells it to."""

import http.server
import threading
from xml.sax.saxutils import escape

from programs import DATA, DevelopmentSts, ProgramTest, ServiceTest, ssoclient
from terminals import TerminalTest

TRUST = DATA / "keys" / "sts-cert.pem"
WST = "http://docs.oasis-open.org/ws-sx/ws-trust/200512"


def fault(code, text="", namespace=WST):
    """A SOAP fault, as a service sends it."""
    return (
        '<s:Envelope xmlns:s="http://schemas.xmlsoap.org/soap/envelope/"><s:Body><s:Fault>'
        f'<faultcode xmlns:{code.partition(":")[0]}="{namespace}">{code}</faultcode>'
        f"<faultstring>{escape(text)}</faultstring></s:Fault></s:Body></s:Envelope>")


class ScriptedService:
    """Answers every request with the same reply; while `hold` is clear, not yet."""

    def __init__(self):
        self.status = 500
        self.body = b""
        self.headers = {"Content-Type": "text/xml"}
        self.request = None  # the last one
        self.request_headers = None
        self.hold = threading.Event()
        self.hold.set()
        self.has_request = threading.Semaphore(0)
        service = self

        class Handler(http.server.BaseHTTPRequestHandler):
            def do_POST(self):
                service.request = self.rfile.read(int(self.headers["Content-Length"]))
                service.request_headers = self.headers
                service.has_request.release()
                service.hold.wait(timeout=120)
                self.send_response(service.status)
                for name, value in service.headers.items():
                    self.send_header(name, value)
                self.send_header("Content-Length", str(len(service.body)))
                self.end_headers()
                self.wfile.write(service.body)

            def log_message(self, *_):
                pass

        self._server = http.server.ThreadingHTTPServer(("127.0.0.1", 0), Handler)
        self.url = f"http://127.0.0.1:{self._server.server_port}/sts"
        self._thread = threading.Thread(target=self._server.serve_forever)
        self._thread.start()

    def say(self, body, status=500, **headers):
        self.body = body if isinstance(body, bytes) else body.encode()
        self.status = status
        self.headers = {"Content-Type": "text/xml", **headers}

    def stop(self):
        self.hold.set()
        self._server.shutdown()
        self._thread.join()
        self._server.server_close()


class ScriptedTest(ProgramTest):
    """A test with a scripted service."""

    @classmethod
    def setUpClass(cls):
        cls.service = ScriptedService()
        cls.addClassCleanup(cls.service.stop)

    def setUp(self):
        super().setUp()
        self.password = self.write("password", "secret\n")

    def command(self, *options):
        return ["acquire", "password", "--url", self.service.url, "--trust", TRUST, "--user", "u",
                "--password-file", self.password, *options]

    def acquire(self, *options):
        return ssoclient(*self.command(*options))


class ScriptedAndRealTest(ScriptedTest, ServiceTest):
    """The same beside a development STS."""

    @classmethod
    def setUpClass(cls):
        super().setUpClass()
        cls.start_sts()

    def setUp(self):
        super().setUp()
        self.write("password", DevelopmentSts.PASSWORD + "\n")


class ScriptedTerminalTest(ScriptedTest, TerminalTest):
    """The same with a terminal."""
