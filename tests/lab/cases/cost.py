"""What it costs to ask the agent for disks, beside lsblk. Times are told, and depend on what else this machine does;
only how many programs the agent runs is held against a limit."""

import agent
import handmade
from case import case, expect

# Asks without a program: what a bash can do by itself. `measure` prints the microseconds of one of COUNT times;
# `programs`, how many processes (and threads) the whole machine starts during a question: the fewest of several,
# since others may start some too.
LIBRARY = """
ask() {
  exec 4<>/dev/tcp/%s/%s
  printf 'GET /api/v1/disks HTTP/1.1\\r\\nHost: %s\\r\\nConnection: close\\r\\n\\r\\n' >&4
  mapfile -t answer <&4
  exec 4>&-
  if [[ ${answer[0]} != 'HTTP/1.1 200 '* || ${answer[*]} != *canonicalName* ]]; then echo "${answer[*]}" >&2; exit 9; fi
}
lsblk_alone() { lsblk --json -O -b >/dev/null; }
kovactl_disks() { kovactl --agent unix:%s disks >/dev/null; }
measure() {
  local start=${EPOCHREALTIME/./} i
  for ((i = 0; i < $1; ++i)); do $2; done
  echo $(((${EPOCHREALTIME/./} - start) / $1))
}
count_started() { while read -r key started _ && [ "$key" != processes ]; do :; done </proc/stat; }
rest() { read -r -t 1.2 -u 5; }
programs() {
  local fewest=1000 i before
  for ((i = 0; i < $1; ++i)); do
    rest
    count_started; before=$started
    ask
    count_started
    if ((started - before < fewest)); then fewest=$((started - before)); fi
  done
  echo "$fewest"
}
rm -f /run/nobody; mkfifo /run/nobody; exec 5<>/run/nobody
udevadm settle --timeout=30
rest; rest
""" % (*agent.ADDRESS.split(":"), agent.ADDRESS, agent.SOCKET)


def numbers(machine, commands):
    return [int(line) for line in machine.check(LIBRARY + commands, limit=150).out.split()]


def tell(what, machine):
    """Prints the times, and hands back the number of programs."""
    lsblk, kovactl, answer, programs = numbers(
        machine, "measure 5 lsblk_alone; measure 3 kovactl_disks; measure 3 ask; programs 3")
    print(f"        {what}: lsblk {lsblk / 1000:.0f} ms, kovactl disks {kovactl / lsblk:.2f} of that, the agent's "
          f"answer {answer / lsblk:.2f}; {programs} programs were run for an answer", flush=True)
    return programs


@case(full=True)
def the_agent_runs_no_program_for_an_answer_without_physical_volumes(machine):
    with agent.running(machine):
        expect.assertEqual(tell("no group", machine), 0)


@case()
def the_agent_runs_at_most_three_programs_for_an_answer_with_a_group(machine):
    with handmade.group(machine), agent.running(machine):
        programs = tell("one group", machine)
        expect.assertIn(programs, (1, 2, 3))
