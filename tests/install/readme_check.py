"""Follows the README to the letter, in a copy of the tree and with an environment of its own."""

import os
import pathlib
import re
import subprocess
import tempfile
import unittest

from commands import run

ROOT = pathlib.Path(__file__).resolve().parents[2]
ADDRESS = "https://git.example.com/ssoclient.git"

# What is said to be done in another terminal, and the line that shows that it is ready.
SERVER = "ssoclient-devsts "
READY = "listening on"

# What is typed into a terminal, and with which password.
KERBEROS = "kinit "
PASSWORD = "alice.password"

# The network and /opt are the test's own, and go with it.
PRELUDE = f"""
set -euo pipefail
ip link set lo up
mount -t tmpfs tmpfs /opt
server_pid=
stop_server() {{
    [[ -z $server_pid ]] || kill "$server_pid"
    wait
    server_pid=
}}
trap stop_server EXIT
start_server() {{
    stop_server
    server >server.log 2>&1 </dev/null &
    server_pid=$!
    for _ in $(seq 300); do
        if grep --quiet '^{READY}' server.log; then return; fi
        sleep 0.1
    done
    cat server.log
    return 1
}}
"""

# The realm ends with the shell, which holds the other end of the pipe. Its keytabs are where the
# README has them.
REALM = f"""
mkfifo realm.pipe
setsid --fork tests/support/kdc.sh <realm.pipe >realm.folder &
exec 9>realm.pipe
for _ in $(seq 300); do
    if [[ -s realm.folder ]]; then break; fi
    sleep 0.1
done
realm=$(cat realm.folder)
export KRB5_CONFIG=$realm/krb5.conf KRB5CCNAME=FILE:$PWD/ticket
cp "$realm"/*.keytab "$realm/{PASSWORD}" .
"""

ENDING = """
./run uninstall /opt/ssoclient
test ! -e /opt/ssoclient
"""


def blocks():
    text = (ROOT / "README.md").read_text("utf-8")
    return re.findall(r"^```sh\n(.*?)^```$", text, re.MULTILINE | re.DOTALL)


def script():
    parts = [PRELUDE]
    for block in blocks():
        if block.startswith(SERVER):
            if "--keytab" in block:
                parts.append(REALM)
            parts.append(f"server() {{\nexec {block}}}\nstart_server\n")  # the job is the server
        elif block.startswith(KERBEROS):
            parts.append(f"kerberos() {{\n{block}}}\nkerberos <{PASSWORD}\n")
        else:
            parts.append(block)
    return "\n".join([*parts, ENDING])


class Readme(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = pathlib.Path(folder.name)
        self.environment = {
            "PATH": "/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin",
            "HOME": str(self.folder),
            # What has been compiled already is not what the README is about.
            "CCACHE_DIR": run("ccache", "--get-config", "cache_dir").strip(),
            "CCACHE_MAXSIZE": run("ccache", "--get-config", "max_size").strip()}
        self.publish()

    def git(self, *arguments):
        return run("git", "-c", "user.name=Test", "-c", "user.email=test@example.test", *arguments,
                   env=self.environment, cwd=self.folder)

    def publish(self):
        """Puts the tree, as it is now, where the address of the README leads."""
        names = run("git", "ls-files", "-z", "--cached", "--others", "--exclude-standard", cwd=ROOT)
        there = [name for name in names.split("\0") if name and (ROOT / name).is_file()]
        subprocess.run(["cp", "--parents", *there, self.folder / "source"],
                       cwd=ROOT, check=(self.folder / "source").mkdir() is None)
        self.git("-C", "source", "init", "--quiet")
        self.git("-C", "source", "add", "--all")
        self.git("-C", "source", "commit", "--quiet", "--message", "All")
        self.git("config", "--global", f"url.{self.folder / 'source'}.insteadOf", ADDRESS)

    def test_every_command_works_in_order(self):
        as_root = [] if os.getuid() == 0 else ["--map-root-user"]
        result = subprocess.run(
            ["unshare", "--mount", "--net", *as_root, "bash", "-c", script()],
            env=self.environment, cwd=self.folder, timeout=1200, text=True,
            stdout=subprocess.PIPE, stderr=subprocess.STDOUT)
        self.assertEqual(0, result.returncode, result.stdout)
        for text in ("export CMAKE_PREFIX_PATH=/opt/ssoclient\n",
                     '"subject"', "valid\n", "Password for alice@EXAMPLE.TEST: ",
                     "uninstalled from /opt/ssoclient\n"):
            self.assertIn(text, result.stdout)

    def test_the_lines_of_the_readme_are_those_that_run_prints(self):
        printed = re.findall(r"^    printf .(export \w+=)", (ROOT / "run").read_text("utf-8"),
                             re.MULTILINE)
        shown = [line for block in blocks() for line in re.findall(r"^export \w+=", block,
                                                                   re.MULTILINE)]
        self.assertEqual(4, len(printed))
        self.assertEqual(printed, shown)


if __name__ == "__main__":
    unittest.main()
