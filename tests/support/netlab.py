"""Networks of their own for tests: hosts in network namespaces, connected by switches to the namespace of the test.

A test calls enter() first, which runs it again inside a new namespace with the rights that it needs there. Everything ends with
the test's process.
"""
import atexit
import os
import subprocess
import sys
import time


def enter():
    """Runs this program again in a network namespace of its own, unless it is in one already."""
    if os.environ.get("NETLAB_INSIDE") != "1":
        environment = dict(os.environ, NETLAB_INSIDE="1")
        command = ["unshare", "-n" if os.geteuid() == 0 else "-rn", sys.executable, *sys.argv]
        os.execvpe(command[0], command, environment)
    subprocess.run(["ip", "link", "set", "lo", "up"], check=True)


def ip(*arguments):
    subprocess.run(["ip", *arguments], check=True)


class Switch:
    """A network that the test's namespace is part of, with this address (10.1.0.1/24 for number 1)."""

    def __init__(self, number):
        self.number = number
        self.name = f"switch{number}"
        self.hosts = 0
        # An address of its own: otherwise it has the lowest of its hosts', which changes when another one comes, and those that
        # know the old one send into the void for half a minute.
        ip("link", "add", self.name, "address", f"02:00:00:00:00:{number:02x}", "type", "bridge")
        ip("addr", "add", f"10.{number}.0.1/24", "broadcast", "+", "dev", self.name)
        ip("link", "set", self.name, "up")


class Host:
    """A namespace with an interface on a switch. Its programs see nothing else."""

    def __init__(self, switch):
        switch.hosts += 1
        self.address = f"10.{switch.number}.0.{switch.hosts + 1}"
        self._own = os.readlink("/proc/self/ns/net")
        self._holder = subprocess.Popen(["unshare", "-n", "sleep", "infinity"])
        atexit.register(self._holder.kill)
        self._await_namespace()
        plug = f"s{switch.number}h{switch.hosts}"
        ip("link", "add", plug, "type", "veth", "peer", "name", "eth0", "netns", str(self._holder.pid))
        ip("link", "set", plug, "master", switch.name, "up")
        self.run("ip", "link", "set", "lo", "up")
        self.run("ip", "addr", "add", f"{self.address}/24", "broadcast", "+", "dev", "eth0")
        self.run("ip", "link", "set", "eth0", "up")

    def _await_namespace(self):
        for _ in range(1000):
            if os.readlink(f"/proc/{self._holder.pid}/ns/net") != self._own:
                return
            time.sleep(0.01)
        raise RuntimeError("no network namespace")

    def command(self, *arguments):
        return ["nsenter", "-t", str(self._holder.pid), "-n", *arguments]

    def run(self, *arguments):
        return subprocess.run(self.command(*arguments), check=True, capture_output=True, text=True)

    def start(self, *arguments, **options):
        """Starts a program that is ended with the test."""
        process = subprocess.Popen(self.command(*arguments), **options)
        atexit.register(process.kill)
        return process

    def start_simulator(self, program, *options):
        """Starts an instrument and waits until it is ready."""
        process = self.start(program, *options, stdout=subprocess.PIPE, text=True)
        for line in process.stdout:
            if line.strip() == "ready":
                return process
        raise RuntimeError("the simulator did not become ready")
