"""What goes wrong when a token is asked for, and how each of it is provoked. As a program it writes
docs/situations.md, which tells what `ssoclient` says and advises: the environment is that of the
tests of the command line."""

import concurrent.futures
import contextlib
import email.utils
import os
import pathlib
import re
import shutil
import socket
import ssl
import subprocess
import tempfile
import threading
import time
import warnings

import lxml.etree

from programs import DATA, SSOCLIENT, DevelopmentSts, Result
from realm import CredentialCache, Realm
from scripted import WST, ScriptedService, fault

DOCUMENT = pathlib.Path(__file__).parents[3] / "docs" / "situations.md"
WSSE = "http://docs.oasis-open.org/wss/2004/01/oasis-200401-wss-wssecurity-secext-1.0.xsd"
SOAP = "http://schemas.xmlsoap.org/soap/envelope/"
INTRODUCTION = """# What goes wrong, and what it says

Each of these failures is provoked by a test, which compares what `ssoclient` prints with what stands
here: the line that every failure has, and the hint that follows at a terminal or with `--explain`.
Ports, digests and the folder of the files are made the same for every run; everything else is as it
is printed. [errors.md](errors.md) has the texts of the libraries, with causes and remedies.
"""


class RawServer:
    """Answers each connection with the same octets, behind TLS if there is a context for it."""

    def __init__(self, reply, context=None, reads=65536):
        self._reply = reply
        self._context = context
        self._reads = reads  # octets of the request
        self._listener = socket.create_server(("127.0.0.1", 0))
        self.port = self._listener.getsockname()[1]
        self._thread = threading.Thread(target=self._serve)
        self._thread.start()

    def _serve(self):
        while True:
            connection, _ = self._listener.accept()
            connection.settimeout(20)
            with connection:
                if not self._answer(connection):
                    return

    def _answer(self, connection):
        """Returns whether to go on."""
        try:
            if self._context is not None:
                connection = self._context.wrap_socket(connection, server_side=True,
                                                       do_handshake_on_connect=False)
                connection.do_handshake()
            if connection.recv(self._reads):
                connection.sendall(self._reply)
        except ssl.SSLError:
            self._drain(connection)
        except OSError:
            pass  # the client has gone
        return not self._stops

    @staticmethod
    def _drain(connection):
        """Lets the client read why its TLS is refused, before the connection is reset."""
        with socket.socket(fileno=connection.detach()) as plain, contextlib.suppress(OSError):
            plain.shutdown(socket.SHUT_WR)
            while plain.recv(65536):
                pass

    _stops = False

    def stop(self):
        self._stops = True
        socket.create_connection(("127.0.0.1", self.port)).close()
        self._thread.join()
        self._listener.close()


class FullServer:
    """Takes no connection: those that wait to be accepted are all that fit."""

    def __init__(self):
        self._sockets = [socket.socket()]
        self._sockets[0].bind(("127.0.0.1", 0))
        self._sockets[0].listen(0)
        self.port = self._sockets[0].getsockname()[1]
        for _ in range(4):
            waiting = socket.socket()
            waiting.setblocking(False)
            waiting.connect_ex(("127.0.0.1", self.port))
            self._sockets.append(waiting)

    def stop(self):
        for each in self._sockets:
            each.close()


class Scene:
    """Services in every state of health, a Kerberos realm, and a folder with files."""

    def __init__(self, stack):
        self.folder = pathlib.Path(stack.enter_context(tempfile.TemporaryDirectory()))
        self._stack = stack
        self.sts = self._keep(DevelopmentSts())
        self.service = self._keep(ScriptedService())
        self.realm = self._keep(Realm())
        self.realm_sts = self._keep(DevelopmentSts(
            "--keytab", self.realm.service_keytab, environment=self.realm.environment))
        self.ticket = self.realm.log_on("alice", self.folder / "ticket")
        self._write_files()
        self.full = self._ask_full_server()  # ends ten seconds later

    def _keep(self, started):
        self._stack.callback(started.stop)
        return started

    def _write_files(self):
        for name, source in (
                ("ca.pem", self.sts.ca), ("sts.pem", self.sts.trust), ("me.key", self.sts.key),
                ("me.pem", self.sts.certificate), ("foreign.pem", DATA / "keys/foreign-cert.pem"),
                ("other.key", DATA / "keys/client-key.pem"),
                ("other.pem", DATA / "keys/client-cert.pem"),
                ("weak.key", DATA / "keys/weak-key.pem"), ("weak.pem", DATA / "keys/weak-cert.pem"),
                ("test.pem", DATA / "keys/sts-cert.pem"),
                ("expired.xml", DATA / "tokens/accepted/clock-start-equals-now.xml"),
                ("sha1.xml", DATA / "tokens/refused/algorithms/algorithm-rsa-sha1.xml"),
                ("encrypted.xml", DATA / "encrypted/accepted/aes256-gcm.xml"),
                ("ec.key", DATA / "keys/sts-p256-key.pem"),
                ("adfs.xml", DATA / "assertions/accepted/adfs-rsa.xml")):
            shutil.copy(source, self.folder / name)
        self.write("password", DevelopmentSts.PASSWORD + "\n")
        self.write("wrong", "wrong\n")
        self.write("empty", "\n")
        self.write("long", "x" * 5000)
        self.write("page.html", "<!DOCTYPE html><html></html>")
        for options in (("x509", "-in", "sts.pem", "-outform", "DER", "-out", "sts.der"),
                        ("pkcs12", "-export", "-nokeys", "-in", "sts.pem", "-passout", "pass:",
                         "-out", "sts.p12"),
                        ("pkcs12", "-export", "-in", "me.pem", "-inkey", "me.key", "-passout",
                         "pass:", "-out", "me.p12"),
                        ("pkcs8", "-topk8", "-in", "me.key", "-passout", "pass:right", "-out",
                         "locked.key")):
            self._run("openssl", *options)
        self._acquire_files()

    def _acquire_files(self):
        for name, options in (("token.xml", ()), ("mine.xml", ("--key", "me.key", "--cert",
                                                               "me.pem"))):
            result = self.password(*options, "--out", name)
            assert result.code == 0, result.err
        text = (self.folder / "token.xml").read_text("utf-8")
        self.write("changed.xml", text.replace(">alice", ">alicia"))
        bearer = (DATA / "tokens/accepted/bearer.xml").read_text("utf-8")
        self.write("cut.xml", bearer[:len(bearer) // 2])
        self.write("future.xml", bearer.replace('"2026-', '"2126-'))
        tree = lxml.etree.fromstring(text.encode())
        lxml.etree.indent(tree)
        self.write("pretty.xml", lxml.etree.tostring(tree, encoding="unicode"))

    def write(self, name, text):
        path = self.folder / name
        path.parent.mkdir(exist_ok=True)
        path.write_text(text, "utf-8")
        return name

    def _run(self, *command, environment=None):
        result = subprocess.run([str(part) for part in command], cwd=self.folder, text=True,
                                stdin=subprocess.DEVNULL, capture_output=True,
                                start_new_session=True, timeout=120, env=environment)
        return Result(result.returncode, result.stdout, result.stderr)

    def tool(self, *arguments, environment=None):
        return self._run(SSOCLIENT, *arguments, "--explain", environment=environment)

    def password(self, *options, url=None, ca="ca.pem", trust="sts.pem", user=DevelopmentSts.USER,
                 file="password"):
        given = (("--url", url or self.sts.url), ("--ca", ca), ("--trust", trust), ("--user", user),
                 ("--password-file", file))
        return self.tool("acquire", "password",
                         *(word for pair in given if pair[1] for word in pair), *options)

    def key(self, key="me.key", certificate="me.pem", *options, url=None):
        return self.tool("acquire", "certificate", "--url", url or self.sts.url, "--ca", "ca.pem",
                         "--trust", "sts.pem", "--key", key, "--cert", certificate, *options)

    def inspect(self, file, *options, trust="sts.pem"):
        return self.tool("inspect", file, "--trust", trust, *options)

    def renew(self, token):
        return self.tool("renew", "--url", self.sts.url, "--ca", "ca.pem", "--trust", "sts.pem",
                         "--key", "me.key", "--cert", "me.pem", "--lifetime", 60, "--token", token)

    def kerberos(self, *options, url=None, **environment):
        return self.tool("acquire", "gss", "--url", url or self.realm_sts.url, "--ca",
                         self.realm_sts.ca, "--trust", self.realm_sts.trust, *options,
                         environment={**self.realm.environment, **environment})

    def keytab(self, file, principal, **environment):
        return self.kerberos("--keytab", file, "--principal", principal, **environment)

    def reply(self, body, status=200, *options, **headers):
        """What a password request ends with if that is the reply."""
        self.service.say(body, status, **headers)
        return self.password(*options, url=self.service.url, ca=None)

    def fault(self, code, namespace=WST, **headers):
        return self.reply(fault(code, "no", namespace), 500, **headers)

    def alices_token(self, *options, user=DevelopmentSts.USER):
        """What a dialect makes of a reply with this token of Alice's."""
        token = (self.folder / "token.xml").read_text("utf-8")
        response = (f'<t:RequestSecurityTokenResponseCollection xmlns:t="{WST}">'
                    "<t:RequestSecurityTokenResponse><t:RequestedSecurityToken>"
                    f"{token}</t:RequestedSecurityToken></t:RequestSecurityTokenResponse>"
                    "</t:RequestSecurityTokenResponseCollection>")
        self.service.say(f'<s:Envelope xmlns:s="{SOAP}"><s:Body>{response}</s:Body></s:Envelope>',
                         200)
        return self.password("--dialect", "default", *options, url=self.service.url, ca=None,
                             user=user)

    def reset(self):
        """What a password request ends with if the server goes before it has read it all."""
        return self.raw(b"", reads=1)

    def late_reply(self):
        server = self._stack.enter_context(socket.create_server(("127.0.0.1", 0)))
        url = f"http://127.0.0.1:{server.getsockname()[1]}/sts"
        return self.password("--timeout", 1, url=url, ca=None)

    def raw(self, reply, context=None, ca=None, reads=65536):
        server = self._keep(RawServer(reply, context, reads))
        scheme = "http" if context is None else "https"
        return self.password(url=f"{scheme}://127.0.0.1:{server.port}/sts", ca=ca)

    def tls(self, days="1", prepare=lambda context: None):
        """What a password request ends with if the server's TLS is like that."""
        self._run("openssl", "req", "-x509", "-newkey", "rsa:2048", "-nodes", "-keyout", "tls.key",
                  "-out", "tls.pem", "-subj", "/CN=sts.example.com", "-addext",
                  "subjectAltName=IP:127.0.0.1", "-days", days)
        context = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
        context.load_cert_chain(self.folder / "tls.pem", self.folder / "tls.key")
        prepare(context)
        return self.raw(b"HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n", context, "tls.pem")

    def expired_tls(self):
        """OpenSSL makes certificates of the past only in the name of an authority."""
        self.write("authority.conf", "[ca]\ndefault_ca=d\n[d]\ndatabase=index\nserial=serial\n"
                   "new_certs_dir=.\ndefault_md=sha256\npolicy=p\nx509_extensions=x\n"
                   "[p]\ncommonName=supplied\n[x]\nsubjectAltName=IP:127.0.0.1\n")
        self.write("index", "")
        self.write("serial", "01\n")
        self._run("openssl", "req", "-new", "-newkey", "rsa:2048", "-nodes", "-keyout", "old.key",
                  "-out", "old.csr", "-subj", "/CN=sts.example.com")
        result = self._run(
            "openssl", "ca", "-batch", "-config", "authority.conf", "-selfsign", "-keyfile",
            "old.key", "-in", "old.csr", "-startdate", "20200101000000Z", "-enddate",
            "20210101000000Z", "-notext", "-out", "old.pem")
        assert result.code == 0, result.err
        context = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
        context.load_cert_chain(self.folder / "old.pem", self.folder / "old.key")
        return self.raw(b"", context, "old.pem")

    def _ask_full_server(self):
        server = self._keep(FullServer())
        url = f"https://127.0.0.1:{server.port}/sts"
        pool = self._stack.enter_context(concurrent.futures.ThreadPoolExecutor(1))
        return pool.submit(lambda: self.password(url=url))

    def profile(self, text, name):
        self.write("ssoclient/config.toml", text)
        return self.tool("profile", "show", name,
                         environment={**os.environ, "XDG_CONFIG_HOME": str(self.folder)})

    def unreachable_realm(self):
        self.write("krb5.conf", "[libdefaults]\n udp_preference_limit = 1\n dns_lookup_kdc = false\n"
                   "[realms]\n EXAMPLE.TEST = {\n  kdc = 127.0.0.1:1\n }\n")
        return self.keytab(self.realm.alice_keytab, "alice@EXAMPLE.TEST",
                           KRB5_CONFIG=str(self.folder / "krb5.conf"))

    def foreign_encryption(self):
        configuration = (self.realm.folder / "krb5.conf").read_text("utf-8")
        self.write("enctypes.conf", configuration.replace(
            "[libdefaults]", "[libdefaults]\n permitted_enctypes = camellia256-cts-cmac"))
        return self.kerberos("--ccache", self.ticket,
                             KRB5_CONFIG=str(self.folder / "enctypes.conf"))

    def normal(self, text):
        """`text` without what differs from run to run."""
        text = text.replace(f"{self.folder}/", "").replace(f"{self.realm.folder}/", "")
        text = re.sub(r"(127\.0\.0\.1(?:[ ]port[ ]|:))(?!1\b)\d+", r"\g<1>8443", text)
        text = re.sub(r"\b[0-9a-f]{64}\b", "…", text)
        return re.sub(r"sha256//(?!A{43})[A-Za-z0-9+/]{43}=", "sha256//…=", text)


def date(days):
    return email.utils.formatdate(time.time() + days * 86400, usegmt=True)


def ask_for_certificate(context):
    context.load_verify_locations(DATA / "keys/foreign-cert.pem")
    context.verify_mode = ssl.CERT_REQUIRED


def speak_old_tls(context):
    context.set_ciphers("ALL:@SECLEVEL=0")
    with warnings.catch_warnings():
        warnings.simplefilter("ignore")  # it is old, as it should be
        context.minimum_version = ssl.TLSVersion.TLSv1
        context.maximum_version = ssl.TLSVersion.TLSv1_1


HTML = "<html><body><form/></body></html>"
OK = b"HTTP/1.1 200 OK\r\nContent-Type: text/xml\r\n"

# Of every group its situations, and what provokes each.
SITUATIONS = {
    "User and password": {
        "The password is wrong": lambda s: s.password(file="wrong"),
        "The user is unknown": lambda s: s.password(user="nobody@example.test"),
        "The password file is not there": lambda s: s.password(file="passwort"),
        "The password file is empty": lambda s: s.password(file="empty"),
        "The password file is another file": lambda s: s.password(file="long"),
        "There is no terminal to ask for the password": lambda s: s.password(file=None),
        "The password stands on the command line":
            lambda s: s.password("--password", "secret"),
    },
    "Key and certificate": {
        "The service does not know the certificate": lambda s: s.key("other.key", "other.pem"),
        "The key is another certificate's": lambda s: s.key("other.key", "me.pem"),
        "The key is encrypted, and there is no terminal to ask for its passphrase":
            lambda s: s.key("locked.key"),
        "The passphrase is wrong":
            lambda s: s.key("locked.key", "me.pem", "--key-passphrase-file", "wrong"),
        "The key is in a PKCS#12 file": lambda s: s.key("me.p12"),
        "The key is in a token, and OpenSSL has no provider for it":
            lambda s: s.key("pkcs11:token=t"),
        "The key file is not there": lambda s: s.key("my.key"),
        "The key is too short": lambda s: s.key("weak.key", "weak.pem"),
        "There is a key and no certificate":
            lambda s: s.password("--key", "me.key"),
    },
    "Clocks and validity": {
        "The service takes the request for too old, and this machine is behind":
            lambda s: s.fault("wst:ExpiredData", Date=date(2)),
        "The service takes the request for too old, and this machine is ahead":
            lambda s: s.fault("wst:MessageExpired", Date=date(-2)),
        "The service takes the request for too old, and its reply does not tell the time":
            lambda s: s.fault("wst:ExpiredData", Date="noon"),
        "The token has expired": lambda s: s.inspect("expired.xml", trust="test.pem"),
        "The token is not valid yet": lambda s: s.inspect("future.xml", trust="test.pem"),
    },
    "Trust in tokens": {
        "Another certificate signs tokens than the trusted one":
            lambda s: s.password(trust="foreign.pem"),
        "The authority of TLS is given as the signer of tokens":
            lambda s: s.password(trust="ca.pem"),
        "The trusted certificate is in DER": lambda s: s.password(trust="sts.der"),
        "The trusted certificate is in a PKCS#12 file": lambda s: s.password(trust="sts.p12"),
        "The file of the trusted certificate holds a key":
            lambda s: s.password(trust="me.key"),
        "The file of the trusted certificate is not there":
            lambda s: s.password(trust="stss.pem"),
    },
    "TLS": {
        "The system's authorities do not know the server": lambda s: s.password(ca=None),
        "The authority is another one's": lambda s: s.password(ca="foreign.pem"),
        "The signer of tokens is given as the authority of TLS":
            lambda s: s.password(ca="sts.pem"),
        "The server has another name": lambda s: s.password("--peer", "sts.example.com"),
        "The server has another key than the pinned one":
            lambda s: s.password("--peer", f"sha256//{'A' * 43}="),
        "The pin is none": lambda s: s.password("--peer", "sha256//pin"),
        "The server's certificate has expired": lambda s: s.expired_tls(),
        "The server asks for a certificate of the client":
            lambda s: s.tls(prepare=ask_for_certificate),
        "The server speaks TLS 1.1 only": lambda s: s.tls(prepare=speak_old_tls),
        "The service speaks http, and https is asked for":
            lambda s: s.password(url=s.service.url.replace("http:", "https:")),
        "The service speaks https, and http is asked for":
            lambda s: s.password(url=s.sts.url.replace("https:", "http:")),
        "The service is another machine, and http is asked for":
            lambda s: s.password(url="http://sts.example.com/sts"),
    },
    "The way to the service": {
        "The host has no address": lambda s: s.password(url="https://sts.example.invalid/sts"),
        "Nobody listens at the port": lambda s: s.password(url="https://127.0.0.1:1/sts"),
        "No connection comes about": lambda s: s.full.result(),
        "The reply does not come": lambda s: s.late_reply(),
        "The connection is closed without a reply": lambda s: s.raw(b""),
        "The connection is reset": lambda s: s.reset(),
        "The reply is not HTTP": lambda s: s.raw(b"220 mail.example.com ESMTP\r\n"),
        "The reply ends within its headers": lambda s: s.raw(b"HTTP/1.1 200 OK\r\nContent-"),
        "The reply ends before its length": lambda s: s.raw(
            OK + b"Content-Length: 100\r\n\r\n<s:Envelope"),
        "The reply is too large": lambda s: s.raw(OK + b"Content-Length: 9000000\r\n\r\n" + bytes(9)),
        "The reply is compressed": lambda s: s.raw(
            OK + b"Content-Encoding: gzip\r\nContent-Length: 1\r\n\r\n\0"),
        "The URL is no address": lambda s: s.password(url="sts.example.com/sts"),
        "The URL has a port that is none": lambda s: s.password(url="https://h:https/sts"),
    },
    "Answers of HTTP": {
        "A redirect": lambda s: s.reply("", 302, Location="https://login.example.com/"),
        "Something wants a log-on": lambda s: s.reply(HTML, 401),
        "Something forbids it": lambda s: s.reply(HTML, 403),
        "The path is wrong": lambda s: s.reply(HTML, 404),
        "The method is refused": lambda s: s.reply(HTML, 405),
        "A proxy wants a log-on": lambda s: s.reply(HTML, 407),
        "The server fails": lambda s: s.reply(HTML, 500),
        "The service behind a proxy is away": lambda s: s.reply(HTML, 502),
        "The service is overloaded": lambda s: s.reply(HTML, 503),
        "A web page that is not XML": lambda s: s.reply("<!DOCTYPE html><html></html>"),
        "A web page that is XML": lambda s: s.reply(HTML),
        "An empty reply": lambda s: s.reply(""),
        "A reply that has another answer in it": lambda s: s.reply(
            f'<s:Envelope xmlns:s="{SOAP}"><s:Body><a/></s:Body></s:Envelope>'),
    },
    "Answers of the service": {
        "It does not grant what is asked for": lambda s: s.fault("wst:InvalidRequest"),
        "It does not understand the request": lambda s: s.fault("wst:BadRequest"),
        "It fails": lambda s: s.fault("wst:RequestFailed"),
        "It does not grant the lifetime": lambda s: s.fault("wst:InvalidTimeRange"),
        "It does not know the audience": lambda s: s.fault("wst:InvalidScope"),
        "It wants a new token": lambda s: s.fault("wst:RenewNeeded"),
        "It does not accept a presented token": lambda s: s.fault("wst:InvalidSecurityToken"),
        "It wants other credentials": lambda s: s.fault("wsse:InvalidSecurity", WSSE),
        "It takes no such credentials": lambda s: s.fault("wsse:UnsupportedSecurityToken", WSSE),
        "It cannot verify the request": lambda s: s.fault("wsse:FailedCheck", WSSE),
        "It does not have the certificate": lambda s: s.fault("wsse:SecurityTokenUnavailable", WSSE),
        "The endpoint does not know WS-Security": lambda s: s.fault("s:MustUnderstand", SOAP),
        "The endpoint speaks another version of SOAP": lambda s: s.fault("s:VersionMismatch", SOAP),
        "It issues a token of somebody else, and a dialect is given":
            lambda s: s.alices_token(user="bob@example.test"),
        "It issues a token for another audience, and a dialect is given":
            lambda s: s.alices_token("--audience", "https://app.example.com"),
        "It says nothing but that it failed": lambda s: s.fault("s:Server", SOAP),
    },
    "Renewing": {
        "The token is not renewable": lambda s: s.renew("mine.xml"),
        "The token is bearer": lambda s: s.renew("token.xml"),
    },
    "Token files": {
        "The file is not there": lambda s: s.inspect("tokn.xml"),
        "The file is a web page": lambda s: s.inspect("page.html"),
        "The file was cut": lambda s: s.inspect("cut.xml"),
        "The token was edited": lambda s: s.inspect("changed.xml"),
        "The token was pretty-printed": lambda s: s.inspect("pretty.xml"),
        "The token is signed with SHA-1": lambda s: s.inspect("sha1.xml", trust="test.pem"),
        "Another producer made the assertion": lambda s: s.inspect("adfs.xml", trust="test.pem"),
        "The assertion is encrypted": lambda s: s.inspect("encrypted.xml", "--general"),
        "The assertion is encrypted for another key":
            lambda s: s.inspect("encrypted.xml", "--decrypt-key", "me.key"),
        "The key to decrypt with is no RSA key":
            lambda s: s.inspect("encrypted.xml", "--decrypt-key", "ec.key"),
        "The assertion is for another audience": lambda s: s.inspect(
            "adfs.xml", "--audience", "https://other.example.com", "--clock-tolerance", 10 ** 9,
            trust="test.pem"),
        "The subject of the assertion has another format": lambda s: s.inspect(
            "adfs.xml", "--subject", "email", "--clock-tolerance", 10 ** 9, trust="test.pem"),
    },
    "Output and profiles": {
        "The folder of --out is not there": lambda s: s.password("--out", "tokens/t.xml"),
        "--out is a device": lambda s: s.password("--out", "/dev/null"),
        "--out is a link": lambda s: s.password("--out", "/proc/self/cwd"),
        "The profile is not in the file": lambda s: s.profile("[test]\n", "tset"),
        "The file of profiles is not TOML": lambda s: s.profile("[test]\nurl = https\n", "test"),
        "There is no file of profiles": lambda s: s.tool(
            "profile", "show", "x", environment={**os.environ, "XDG_CONFIG_HOME": "/none"}),
    },
    "The command line": {
        "A command that is nearly one": lambda s: s.tool("aquire"),
        "An option that is nearly one": lambda s: s.inspect("token.xml", "--jsn"),
        "An option is missing": lambda s: s.tool("inspect", "token.xml"),
        "A time with a unit": lambda s: s.password("--lifetime", "1h"),
        "A lifetime that is none": lambda s: s.password("--lifetime", 0),
        "An argument too many": lambda s: s.password("secret"),
        "An empty value": lambda s: s.password("--user", ""),
    },
    "Kerberos": {
        "There is no ticket": lambda s: s.kerberos(KRB5CCNAME="FILE:none"),
        "The cache that is named is not there": lambda s: s.kerberos("--ccache", "none"),
        "The ticket has expired": lambda s: s.kerberos(
            "--ccache", CredentialCache(s.ticket).expire(s.folder / "old-ticket")),
        "The realm does not know the service": lambda s: s.kerberos(
            "--ccache", s.ticket, "--service", "HTTP@sts.example.com"),
        "The service is in a realm that is not known": lambda s: s.kerberos(
            "--ccache", s.ticket, "--service", "HTTP/localhost@OTHER.TEST"),
        "The name of the service has another form": lambda s: s.kerberos("--service", "HTTP"),
        "The service has no key of the realm": lambda s: s.kerberos(
            "--ccache", s.ticket, "--service", "krbtgt/EXAMPLE.TEST@EXAMPLE.TEST"),
        "The service takes no Kerberos": lambda s: s.tool(
            "acquire", "gss", "--url", s.sts.url, "--ca", "ca.pem", "--trust", "sts.pem",
            "--ccache", s.ticket, environment=s.realm.environment),
        "The service does not know the user": lambda s: s.keytab(s.realm.mallory_keytab, "mallory"),
        "The keytab is not there": lambda s: s.keytab("alice.keytab", "alice"),
        "The keytab is none": lambda s: s.keytab("password", "alice"),
        "The keytab has no key of the principal":
            lambda s: s.keytab(s.realm.mallory_keytab, "alice"),
        "No key distribution centre answers": lambda s: s.unreachable_realm(),
        "This machine and the realm have no encryption in common":
            lambda s: s.foreign_encryption(),
        "The configuration of Kerberos is broken": lambda s: s.keytab(
            s.realm.alice_keytab, "alice", KRB5_CONFIG=s.folder / s.write("bad.conf", "[a\n")),
    },
}


def provoke(stack):
    """Yields of each situation its group, its title and its result."""
    scene = Scene(stack)
    for group, situations in SITUATIONS.items():
        for title, run in situations.items():
            result = run(scene)
            yield group, title, result._replace(err=scene.normal(result.err))


def describe(results):
    """The document."""
    text = INTRODUCTION
    current = None
    for group, title, result in results:
        if group != current:
            text += f"\n## {group}\n"
            current = group
        text += f"\n**{title}** (exit code {result.code})\n\n```text\n{result.err}```\n"
    return text


def main():
    with contextlib.ExitStack() as stack:
        DOCUMENT.write_text(describe(provoke(stack)), "utf-8")


if __name__ == "__main__":
    main()
