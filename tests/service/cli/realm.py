"""A Kerberos realm of its own, and a development STS that is one of its services."""

import os
import pathlib
import struct
import subprocess

from programs import ServiceTest, ssoclient

KDC = pathlib.Path(os.environ["KDC"])


class Realm:
    """EXAMPLE.TEST, whose key distribution centre runs until `stop`."""

    def __init__(self):
        self._kdc = subprocess.Popen(["setsid", "--fork", KDC], stdin=subprocess.PIPE,
                                     stdout=subprocess.PIPE, text=True)
        folder = self._kdc.stdout.readline().rstrip("\n")
        assert folder, "the KDC did not start"
        self.folder = pathlib.Path(folder)
        self.service_keytab = self.folder / "service.keytab"
        self.alice_keytab = self.folder / "alice.keytab"
        self.mallory_keytab = self.folder / "mallory.keytab"
        # Nobody else's tickets and keys count.
        self.environment = {name: value for name, value in os.environ.items()
                            if not name.startswith("KRB5")}
        self.environment["KRB5_CONFIG"] = str(self.folder / "krb5.conf")

    def log_on(self, principal, ccache):
        """Puts a ticket-granting ticket of the principal into `ccache`."""
        subprocess.run(
            ["kinit", "-k", "-t", self.folder / f"{principal}.keytab", "-c", f"FILE:{ccache}",
             principal], check=True, env=self.environment)
        return ccache

    def stop(self):
        """Returns when the KDC and its folder are gone."""
        self._kdc.communicate()


class CredentialCache:
    """The tickets of a FILE credential cache, format version 4. All its numbers are big-endian."""

    TIMES = struct.Struct(">4I")  # of the authentication, the start, the end and the last renewal

    def __init__(self, path):
        self._data = bytearray(path.read_bytes())
        self._position = 0
        assert self._number(">H") == 0x0504, "another version"
        self._bytes(">H")
        self._principal()
        self.tickets = []
        self._times = []
        while self._position < len(self._data):
            self._credential()

    def expire(self, path):
        """Writes a copy whose tickets all ended long ago."""
        for position in self._times:
            self.TIMES.pack_into(self._data, position, 1000000000, 1000000000, 1000000001, 0)
        path.write_bytes(self._data)
        return path

    def _credential(self):
        self._principal()
        realm = self._principal()
        self._number(">H")  # key type
        self._bytes(">I")  # key
        times = self._position
        self._position += self.TIMES.size + 5  # and flags
        for _ in range(2):  # addresses, authorization data
            for _ in range(self._number(">I")):
                self._number(">H")
                self._bytes(">I")
        ticket = self._bytes(">I")
        self._bytes(">I")
        if realm != b"X-CACHECONF:":  # which marks settings of the cache
            self.tickets.append(ticket)
            self._times.append(times)

    def _principal(self):
        """Returns its realm."""
        self._number(">I")
        components = self._number(">I")
        realm = self._bytes(">I")
        for _ in range(components):
            self._bytes(">I")
        return realm

    def _number(self, form):
        number, = struct.unpack_from(form, self._data, self._position)
        self._position += struct.calcsize(form)
        return number

    def _bytes(self, form):
        size = self._number(form)
        self._position += size
        return bytes(self._data[self._position - size:self._position])


class KerberosTest(ServiceTest):
    """A test with a realm and a development STS in it, which all tests of its class share."""

    @classmethod
    def setUpClass(cls):
        cls.realm = Realm()
        cls.addClassCleanup(cls.realm.stop)
        cls.start_sts("--keytab", cls.realm.service_keytab, environment=cls.realm.environment)
        cls.ccache = cls.realm.log_on("alice", cls.realm.folder / "alice")

    def acquire_by_gss(self, *options, service=None, environment=None):
        return ssoclient("acquire", "gss", *(service or self.sts.service_options), *options,
                         environment={**self.realm.environment, **(environment or {})})

    @property
    def with_keytab(self):
        return ["--keytab", self.realm.alice_keytab, "--principal", "alice"]
