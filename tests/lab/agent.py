"""The agent in the guest, on the guest's own disks, for as long as a case asks it.

    with agent.running(machine) as agent_here:
        agent_here.disks()
        agent_here.run("claim")

It may end before: with the machine, if a case cuts its power."""

import contextlib

SOCKET = "/run/agentd.sock"
ADDRESS = "127.0.0.1:7777"  # for those who ask without a program


class Agent:
    """Answers at once, or the case fails."""

    def __init__(self, machine):
        self._machine = machine

    def disks(self):
        return self._ask("disks")

    def groups(self):
        return self._ask("groups").get("diskMapInfo", [])

    def run(self, arguments, limit=300):
        """What kovactl prints; the case fails unless the change is made."""
        return self._machine.check(command(arguments), limit).out

    def _ask(self, what):
        return self._machine.check(command(what + " -o json")).json()


def command(arguments):
    return f"kovactl --agent unix:{SOCKET} {arguments}"


@contextlib.contextmanager
def running(machine):
    machine.check(f"rm -f /run/ready; setsid agentd --host linux --listen unix:{SOCKET} --listen tcp:{ADDRESS} "
                  "--ready-file /run/ready </dev/null >/run/agentd.log 2>&1 & echo $! >/run/agentd.pid")
    try:
        machine.eventually("the agent answers", lambda: machine.run("test -s /run/ready").status == 0)
        yield Agent(machine)
    finally:
        if machine.answers:
            end(machine)


def end(machine):
    machine.run("kill $(cat /run/agentd.pid)")
    machine.eventually("the agent has ended", lambda: machine.run("kill -0 $(cat /run/agentd.pid)").status != 0)
