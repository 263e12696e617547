"""The programs on the machine that this runs on, whatever disks it has. Nothing is changed."""

import os
import unittest

from programs import ProgramTest


def devices():
    """Kernel names of the whole devices that this machine's kernel shows."""
    return sorted(os.listdir("/sys/block")) if os.path.isdir("/sys/block") else []


def is_in_use(name):
    """By signs that need no look at the disk: a partition, a holder, a mount of the device itself."""
    folder = os.path.join("/sys/block", name)
    with open(os.path.join(folder, "dev"), encoding="ascii") as file:
        number = file.read().strip()
    with open("/proc/self/mountinfo", encoding="utf-8", errors="replace") as file:
        is_mounted = any(line.split()[2] == number for line in file)
    has_partitions = any(os.path.exists(os.path.join(folder, entry, "partition")) for entry in os.listdir(folder))
    return is_mounted or has_partitions or bool(os.listdir(os.path.join(folder, "holders")))


class ThisMachine(ProgramTest):
    def here(self, *arguments):
        settings = self.path("settings.json")
        return self.kovactl("--host", "linux", "--settings", settings, *arguments)

    def disks(self):
        outcome = self.here("-o", "json", "disks")
        self.assert_ended(outcome, 0)
        return outcome.json()

    def test_is_listed_with_a_reason_for_each_disk_that_cannot_be_used(self):
        for result in self.disks():
            self.assertTrue(result["disk"]["deviceName"].startswith("/dev/"), result)
            if result["state"] == "ineligible":
                self.assertTrue(result["disk"]["detail"], result)
                self.assertIn("error", result)

    def test_offers_no_disk_that_is_in_use(self):
        used = ["/dev/" + name for name in devices() if is_in_use(name)]
        offered = [result["disk"]["deviceName"] for result in self.disks() if result["state"] == "eligible"]
        self.assertEqual([name for name in offered if name in used], [])

    def test_is_served_by_an_agent_alike(self):
        self.start_agent("--host", "linux", "--settings", self.path("settings.json"))
        asked = self.ask_agent("-o", "json", "disks")
        self.assert_ended(asked, 0)
        self.assertEqual(asked.json(), self.disks())
        self.assertIn("disk", self.ask_agent("disks").out)
        self.assert_ended(self.ask_agent("groups"), 0)

    def test_is_planned_for_on_a_twin(self):
        plan = self.here("-o", "json", "plan", "add", "--all")
        self.assertIn(plan.status, (0, 1), plan.err)  # whether there is a disk to be used nobody knows
        told = plan.json()
        self.assertRegex(told["generation"], "^[0-9a-f]{16}$")
        eligible = [result["disk"]["canonicalName"] for result in self.disks() if result["state"] == "eligible"]
        named = [name for group in told["groups"] for name in [group["ssd"], *group["capacity"]]]
        self.assertLessEqual(set(named), set(eligible))
        self.start_agent("--host", "linux", "--settings", self.path("settings.json"))
        asked = self.ask_agent("-o", "json", "plan", "add", "--all")
        self.assertEqual((asked.status, asked.json()), (plan.status, told))

    def test_a_twin_answers_like_it(self):
        self.start_agent("--host", "linux", "--settings", self.path("settings.json"))
        status, answer = self.http().post("GetTwin")
        self.assertEqual(status, 200, answer)
        twin = self.write("twin.json", answer["result"]["description"])

        def shown(results):
            return [(one["disk"]["canonicalName"], one["state"], one["disk"].get("detail"), one.get("error"))
                    for one in results]

        self.assertEqual(shown(self.kovactl("--host", twin, "-o", "json", "disks").json()), shown(self.disks()))

    def test_has_no_description(self):
        self.assert_ended(self.here("sim", "show"), 2, "no simulated host")

    def test_is_configured_by_its_settings(self):
        self.write("settings.json", {"cluster": {"enabled": True, "clusterUuid": "c-1", "nodeUuid": "n-1"},
                                     "faultDomain": "rack-7", "networks": [
                                         {"interface": "otx1", "masterMulticastGroup": "224.1.2.3",
                                          "agentMulticastGroup": "FF19::1"}]})
        told = self.here("config")
        self.assert_ended(told, 0)
        for word in ("c-1", "n-1", "rack-7", "otx1", "224.1.2.3", "FF19::1"):
            self.assertIn(word, told.out)

    def test_is_not_served_with_settings_that_hold_a_mistake(self):
        self.write("settings.json", {"faultDomain": 7})
        self.assert_ended(self.here("disks"), 2, "settings.json: faultDomain: must be a text")
        outcome = self.agentd("--host", "linux", "--settings", self.path("settings.json"))
        self.assertNotEqual(outcome.status, 0)
        self.assertIn("settings.json: faultDomain: must be a text", outcome.err)

    def test_is_not_served_with_settings_that_others_may_write(self):
        os.chmod(self.write("settings.json", {}), 0o666)
        self.assert_ended(self.here("disks"), 2, "chmod go-w")

    def test_a_mistake_made_while_the_agent_runs_is_told_until_it_is_mended(self):
        self.write("settings.json", {})
        self.start_agent("--host", "linux", "--settings", self.path("settings.json"))
        self.assert_ended(self.ask_agent("config"), 0)
        self.write("settings.json", {"faultDomain": 7})
        self.assertNotIn("rack", self.ask_agent("config").out)
        self.assert_ended(self.ask_agent("plan", "add", "--all"), 1, "faultDomain: must be a text")
        self.write("settings.json", {"faultDomain": "rack-7"})
        told = self.ask_agent("config")
        self.assert_ended(told, 0)
        self.assertIn("rack-7", told.out)

    def test_nothing_is_saved_of_it(self):
        self.assert_ended(self.here("--save", "disks"), 2, "--save")

    def test_capacity_flash_wants_a_flash_disk_of_it(self):
        self.assert_ended(self.here("capacity-flash", "set", "naa.none"), 2, "no disk 'naa.none'")
        for result in self.disks():
            name = result["disk"]["canonicalName"]
            marked = self.here("capacity-flash", "set", name)  # in the test's own file
            self.assert_ended(marked, 0 if result["disk"]["ssd"] else 2)
        self.assert_ended(self.here("capacity-flash", "clear", "naa.none"), 0)

    def test_changes_are_refused(self):
        # Never with the name of a disk that is there: this may be anybody's machine.
        refused = self.here("init", "--ssd", "naa.none", "--disk", "naa.nobody", "--yes")
        self.assertNotEqual(refused.status, 0, refused.out)


if __name__ == "__main__":
    unittest.main(verbosity=2)
