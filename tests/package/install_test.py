#!/usr/bin/python3
# SPDX-License-Identifier: Apache-2.0
"""Installs a build into a temporary prefix and looks at it from outside: a bus that knows nothing but
the prefix starts the daemon, the unit's confinement leaves daemon and indexer what they need, no
program can reach a network, and the manual knows every setting, command and option.

Environment: CMAKE, KEEPSAKES_BUILD and KEEPSAKES_SOURCE, the folders of both; KEEPSAKES_SANITIZED is 1
when the build has a sanitizer."""

import ctypes
import errno
import json
import os
import re
import select
import shutil
import signal
import socket
import subprocess
import tempfile
import unittest
from pathlib import Path

import dbus
import seccomp

SOURCE = Path(os.environ["KEEPSAKES_SOURCE"])
SANITIZED = os.environ.get("KEEPSAKES_SANITIZED") == "1"
NAME = "com.brindle.keepsakesd"
TRACK = SOURCE / "data/sample/tracks/2024-06-15-hike.gpx"

BUS_CONFIGURATION = """<!DOCTYPE busconfig PUBLIC "-//freedesktop//DTD D-Bus Bus Configuration 1.0//EN"
 "http://www.freedesktop.org/standards/dbus/1.0/busconfig.dtd">
<busconfig>
  <type>session</type>
  <listen>unix:dir={folder}</listen>
  <servicedir>{prefix}/share/dbus-1/services</servicedir>
  <policy context="default">
    <allow send_destination="*" eavesdrop="true"/>
    <allow eavesdrop="true"/>
    <allow own="*"/>
  </policy>
</busconfig>
"""

# What the programs may link, each with the reason why it is no way to a network.
ALLOWED = re.compile(r"""lib(
    systemd                             # the session bus, a local socket by the unit's word
    | sqlite3 | ical | icui18n | icuuc | expat | xml2 | pugixml | exiv2 | tomlplusplus   # formats
    | fmt | spdlog | nettle | seccomp   # text, logging, hashes, confinement
    | stdc\+\+ | m | gcc_s | c          # the languages' own
    | asan | ubsan | tsan               # in builds with a sanitizer
    )\.so\.[0-9.]+ | ld-linux.*""", re.VERBOSE)
NETWORK = re.compile(r"lib(curl|soup|ssl|gnutls|nss3|ssh|ssh2|resolv|anl|nghttp|ares|ldap|gio|"
                     r"krb5|Qt.Network|cpprest|boost_asio|zmq|enet|neon)")


def run(*arguments, **options):
    return subprocess.run(arguments, check=True, capture_output=True, text=True, timeout=50,
                          **options).stdout


class Prefix(unittest.TestCase):
    """An installed build; each test with a home of its own."""

    @classmethod
    def setUpClass(cls):
        folder = tempfile.TemporaryDirectory(prefix="keepsakes-install-")
        cls.addClassCleanup(folder.cleanup)
        cls.prefix = Path(folder.name) / "prefix"
        run(os.environ["CMAKE"], "--install", os.environ["KEEPSAKES_BUILD"], "--prefix", cls.prefix)
        cls.daemon = cls.prefix / "bin/keepsakesd"
        cls.client = cls.prefix / "bin/keepsakesctl"
        cls.indexer = cls.prefix / "libexec/keepsakesd/keepsakes-indexer"
        cls.unit = cls.prefix / "lib/systemd/user/keepsakesd.service"

    def setUp(self):
        folder = tempfile.TemporaryDirectory(prefix="keepsakes-home-")
        self.addCleanup(folder.cleanup)
        self.home = Path(folder.name)
        for folder in ("Tracks", "Pictures"):
            (self.home / folder).mkdir()
        shutil.copy(TRACK, self.home / "Tracks")
        kept = ("PATH", "LANG", "TZ", "ASAN_OPTIONS", "UBSAN_OPTIONS", "TSAN_OPTIONS")
        self.environment = {name: os.environ[name] for name in kept if name in os.environ}
        self.environment["HOME"] = str(self.home)

    def start_bus(self):
        """A bus that can start what the prefix holds; programs of its log to `log`."""
        configuration = self.home / "bus.conf"
        configuration.write_text(BUS_CONFIGURATION.format(folder=self.home, prefix=self.prefix))
        self.log = self.home / "log"
        with open(self.log, "w") as log:
            bus = subprocess.Popen(
                ["dbus-daemon", f"--config-file={configuration}", "--nofork", "--print-address=1"],
                stdout=subprocess.PIPE, stderr=log, text=True, env=self.environment)
        self.addCleanup(self.end_process, bus)
        self.environment["DBUS_SESSION_BUS_ADDRESS"] = bus.stdout.readline().strip()

    def end_process(self, process):
        process.terminate()
        process.communicate(timeout=50)

    def end_activated_daemon(self):
        bus = dbus.bus.BusConnection(self.environment["DBUS_SESSION_BUS_ADDRESS"])
        number = bus.call_blocking("org.freedesktop.DBus", "/org/freedesktop/DBus",
                                   "org.freedesktop.DBus", "GetConnectionUnixProcessID", "s", [NAME])
        process = os.pidfd_open(number)
        self.addCleanup(os.close, process)
        signal.pidfd_send_signal(process, signal.SIGTERM)
        ended, _, _ = select.select([process], [], [], 50)
        self.assertTrue(ended, "the daemon did not end")
        bus.close()

    def ctl(self, *arguments):
        return run(self.client, *arguments, env=self.environment)

    def assert_collects(self):
        self.ctl("collect")
        status = json.loads(self.ctl("status", "--json"))
        self.assertEqual((status["FilesIndexed"], status["Problems"]), (1, []),
                         self.log.read_text())


class ServiceTest(Prefix):
    def test_a_request_starts_the_daemon_which_finds_its_indexer(self):
        self.start_bus()
        status = json.loads(self.ctl("status", "--json"))
        self.assertTrue(status["DatabaseAvailable"])
        self.assert_collects()
        self.end_activated_daemon()
        self.assertNotIn("warning", self.log.read_text())

    @unittest.skipIf(SANITIZED, "a sanitizer needs calls that the unit withholds")
    def test_the_units_confinement_leaves_what_is_needed(self):
        self.start_bus()
        settings = unit_settings(self.unit)
        self.assertEqual(settings["RestrictAddressFamilies"], ["AF_UNIX"])
        calls = allowed_calls(settings["SystemCallFilter"])
        self.assertNotIn("mount", calls)
        with open(self.log, "a") as log:
            daemon = subprocess.Popen([self.daemon], stderr=log, env=self.environment,
                                      preexec_fn=lambda: confine(calls))
        self.addCleanup(self.end_process, daemon)
        bus = dbus.bus.BusConnection(self.environment["DBUS_SESSION_BUS_ADDRESS"])
        while not bus.name_has_owner(NAME):
            self.assertIsNone(daemon.poll(), self.log.read_text())
        bus.close()
        self.assertIn("Seccomp:\t2", Path(f"/proc/{daemon.pid}/status").read_text())
        self.assert_collects()
        given_up = "without seccomp|warning" + ("|without landlock" if has_landlock() else "")
        self.assertNotRegex(self.log.read_text(), given_up)

    def test_the_unit_is_right_and_stays_confined(self):
        units = self.home / "units"
        shutil.copytree(self.unit.parent, units)
        drop_ins = units / f"{self.unit.name}.d"
        environment = self.environment | {"XDG_RUNTIME_DIR": str(self.home)}

        def analyze(*arguments):
            analyzed = subprocess.run(
                ["systemd-analyze", "--user", "--man=no", *arguments, units / self.unit.name],
                capture_output=True, text=True, timeout=50, env=environment)
            self.assertEqual((analyzed.returncode, analyzed.stderr), (0, ""), analyzed.stdout)

        # Tenths of the exposure that systemd-analyze reckons; most of it is root's, which a user
        # never has.
        for exposure in (61, 31):
            analyze("verify")
            analyze("security", "--offline=true", f"--threshold={exposure}")
            drop_ins.mkdir(exist_ok=True)
            shutil.copy(self.prefix / "share/doc/keepsakesd/examples/hardening.conf", drop_ins)

    @unittest.skipIf(SANITIZED, "a sanitizer brings libraries of its own")
    def test_no_program_links_a_way_to_a_network(self):
        for program in (self.daemon, self.client, self.indexer):
            needed = re.findall(r"\(NEEDED\).*\[(.*)\]", run("readelf", "-d", program))
            self.assertIn("libc.so.6", needed)
            self.assertEqual([name for name in needed if not ALLOWED.fullmatch(name)], [],
                             f"{program.name} links what ALLOWED does not name")
            self.assertNotRegex(run("ldd", program), NETWORK)


def has_landlock():
    create_ruleset, version = 444, 1
    return ctypes.CDLL(None).syscall(create_ruleset, None, 0, version) > 0


def unit_settings(unit):
    settings = {}
    for line in unit.read_text().splitlines():
        name, equals, value = line.partition("=")
        if equals and not line.startswith("#"):
            settings.setdefault(name, []).append(value)
    return settings


def calls_of(word):
    """The system calls that a word of SystemCallFilter= stands for."""
    if not word.startswith("@"):
        return {word}
    lines = run("systemd-analyze", "syscall-filter", word).splitlines()[1:]
    words = [line.strip() for line in lines if line.strip() and "#" not in line]
    return set().union(*(calls_of(inner) for inner in words))


def allowed_calls(lines):
    allowed = calls_of("@default")
    for line in lines:
        calls = set().union(*(calls_of(word) for word in line.removeprefix("~").split()))
        allowed = allowed - calls if line.startswith("~") else allowed | calls
    return allowed


def confine(calls):
    """What the service manager does for SystemCallFilter=, RestrictAddressFamilies=AF_UNIX and
    MemoryDenyWriteExecute=, from here on."""
    rules = seccomp.SyscallFilter(defaction=seccomp.ERRNO(errno.EPERM))
    write, execute = 2, 4  # PROT_WRITE, PROT_EXEC
    conditions = {
        "socket": [seccomp.Arg(0, seccomp.EQ, socket.AF_UNIX)],
        "mmap": [seccomp.Arg(2, seccomp.MASKED_EQ, write, 0),
                 seccomp.Arg(2, seccomp.MASKED_EQ, execute, 0)],
        "mprotect": [seccomp.Arg(2, seccomp.MASKED_EQ, execute, 0)],
    }
    for call in calls:
        try:
            for condition in conditions.get(call, [None]):
                rules.add_rule(seccomp.ALLOW, call, *([condition] if condition else []))
        except (RuntimeError, ValueError):
            pass  # A call of other architectures.
    rules.load()


class ManualTest(Prefix):
    def manual(self, page):
        text = (self.prefix / "share/man" / f"man{page[-1]}" / page).read_text()
        return text.replace("\\-", "-")

    def test_every_setting_is_documented_and_the_example_is_right(self):
        table = (SOURCE / "src/config/Configuration.cpp").read_text()
        keys = re.findall(r'\{"(\w+)", "(\w+)", \w+\(to\.', table)
        self.assertGreaterEqual(len(keys), 18)
        example = (self.prefix / "share/doc/keepsakesd/examples/config.toml").read_text()
        active = re.sub(r"(?m)^#(?=\w)", "", example)
        manual = self.manual("keepsakesd.toml.5")
        for section, key in keys:
            for text, heading, line in ((manual, rf"\.Ss \[{section}\]", rf"\.It Cm {key}\b"),
                                        (active, rf"\[{section}\]", rf"{key}\b")):
                part = re.search(rf"(?ms)^{heading}(.*?)(^\.Ss|^\[|\Z)", text)
                self.assertTrue(part and re.search(rf"(?m)^{line}", part[1]), (section, key))

        configuration = self.home / "config.toml"
        configuration.write_text(active)
        self.environment["DBUS_SESSION_BUS_ADDRESS"] = "unix:path=/nonexistent"
        refused = subprocess.run([self.daemon, "--config", configuration], capture_output=True,
                                 text=True, env=self.environment, timeout=50)
        self.assertRegex(refused.stderr, "bus", "the example was not taken")
        self.assertNotIn("config.toml", refused.stderr)

    def test_every_command_and_option_is_documented(self):
        pages = {self.daemon: "keepsakesd.1", self.client: "keepsakesctl.1",
                 self.indexer: "keepsakes-indexer.1"}
        for program, page in pages.items():
            manual = self.manual(page)
            help_text = run(program, "--help")
            commands = subcommands(help_text)
            help_text += "".join(run(program, command, "--help") for command in commands)
            options = set(re.findall(r"(?<![\w-])--([a-z-]+)", help_text))
            self.assertGreaterEqual(len(options), 5)
            patterns = ([rf"\.(It )?Cm .*\b{command}\b" for command in commands]
                        + [rf"Fl -{option}\b" for option in options])
            self.assertEqual([pattern for pattern in patterns if not re.search(pattern, manual)],
                             [], f"{page} does not say")

    def test_completion_offers_what_the_client_has(self):
        script = self.prefix / "share/bash-completion/completions/keepsakesctl"
        for words, offered in (
                (["e"], ["events", "export"]),
                (["events", "--s"], ["--since"]),
                (["events", "--category", "photo"], [r"Photo\ Keepsake"]),
                (["defaults", "w"], ["write"]),
                (["defaults", "read", ""], [NAME]),
                (["store", "Tr"], ["Tracks"])):
            completed = run(
                "bash", "-c", '. /usr/share/bash-completion/bash_completion; . "$1"; shift; '
                'COMP_LINE=$*; COMP_POINT=${#COMP_LINE}; COMP_WORDS=("$@"); COMP_CWORD=$(($# - 1)); '
                '_keepsakesctl "$1" "${!#}" "${COMP_WORDS[COMP_CWORD - 1]}"; '
                r'printf "%s\n" "${COMPREPLY[@]}"', "bash", script, self.client, *words,
                env=self.environment, cwd=self.home)
            self.assertEqual(completed.splitlines(), offered, words)


def subcommands(help_text):
    _, _, listed = help_text.partition("\nSubcommands:\n")
    return re.findall(r"(?m)^  ([a-z]+) ", listed)


if __name__ == "__main__":
    unittest.main()
