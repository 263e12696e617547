#!/usr/bin/env python3
"""The lint finds what it is there to find."""

import unittest

from include_rules import RULES, circle_in, faults_of


def reasons(path, line):
    return [reason for _, reason in faults_of(path, line)]


class IncludeRules(unittest.TestCase):
    def test_a_lower_room_may_not_know_a_higher_one(self):
        self.assertEqual(len(reasons("tessa/Ref.h", '#include "orbis/Any.h"')), 1)
        self.assertEqual(len(reasons("otxctl/sim/SimHost.h", '#include "nox/Host.h"')), 1)
        self.assertEqual(len(reasons("host/Gate.cpp", '#include "agentd/Trace.h"')), 1)

    def test_a_higher_room_may_know_a_lower_one(self):
        self.assertEqual(reasons("orbis/Any.h", '#include "tessa/Ref.h"'), [])
        self.assertEqual(reasons("kova/agentd/disks/DiskQuery.h", '#include "kova/agentd/include/KovaRecords.h"'), [])

    def test_the_plug_in_knows_the_kernel_library_by_its_shared_headers_only(self):
        self.assertEqual(len(reasons("kova/agentd/KovaManagerImpl.cpp", '#include "otxctl/TaskScope.h"')), 1)

    def test_the_kernel_library_does_not_see_the_plug_ins_constants(self):
        self.assertEqual(len(reasons("otxctl/sim/SimHost.cpp", '#include "kova/agentd/include/KovaConstants.h"')), 1)

    def test_the_pure_planning_rules_know_nothing(self):
        self.assertEqual(len(reasons("kova/agentd/planning/pure/Plan.h", '#include "tessa/Ref.h"')), 1)

    def test_the_plug_ins_folders_stand_in_a_row(self):
        self.assertEqual(len(reasons("kova/agentd/marshal/A.h", '#include "kova/agentd/query/B.h"')), 1)
        self.assertEqual(len(reasons("kova/agentd/query/A.h", '#include "kova/agentd/planning/B.h"')), 1)
        self.assertEqual(len(reasons("kova/agentd/disks/A.h", '#include "kova/agentd/KovaManagerImpl.h"')), 1)
        self.assertEqual(reasons("kova/agentd/planning/A.h", '#include "kova/agentd/disks/B.h"'), [])

    def test_libraries_stay_in_their_rooms(self):
        self.assertEqual(len(reasons("orbis/soap/SoapReader.cpp", "#include <expat.h>")), 1)
        self.assertEqual(reasons("orbis/xml/XmlReader.cpp", "#include <expat.h>"), [])
        self.assertEqual(len(reasons("orbis/xml/XmlWriter.cpp", "#include <utf8.h>")), 1)
        self.assertEqual(reasons("tessa/text/Utf8.cpp", "#include <utf8.h>"), [])
        self.assertEqual(len(reasons("kovactl/cli/main.cpp", "#include <boost/asio.hpp>")), 1)
        self.assertEqual(len(reasons("agentd/routes/Routes.cpp", "#include <openssl/ssl.h>")), 1)
        self.assertEqual(reasons("agentd/http/TlsServer.cpp", "#include <openssl/ssl.h>"), [])
        self.assertEqual(len(reasons("kova/agentd/KovaLibManager.cpp", "#include <unistd.h>")), 1)

    def test_tests_may_use_anything(self):
        self.assertEqual(reasons("tessa/Ref_test.cpp", '#include "tests/support/Builders.h"'), [])
        self.assertEqual(reasons("host/testing/Process.h", "#include <gtest/gtest.h>"), [])
        self.assertEqual(len(reasons("host/Gate.h", "#include <gtest/gtest.h>")), 1)

    def test_a_folder_with_a_row_is_none_of_the_folder_around_it(self):
        self.assertEqual(len(reasons("host/Gate.cpp", '#include "otxctl/sim/SimHost.h"')), 1)
        self.assertEqual(len(reasons("agentd/http/HttpServer.cpp", '#include "agentd/routes/Routes.h"')), 1)
        self.assertEqual(len(reasons("orbis/Engine.cpp", '#include "orbis/soap/SoapWriter.h"')), 1)
        self.assertEqual(reasons("kovactl/change/Consent.cpp", '#include "kovactl/Words.h"'), [])

    def test_what_carries_texts_does_not_know_what_they_say(self):
        self.assertEqual(len(reasons("orbis/xml/XmlReader.cpp", '#include "orbis/Soap.h"')), 1)
        self.assertEqual(reasons("orbis/xml/TreeBuilder.cpp", '#include "orbis/Namespaces.h"'), [])
        self.assertEqual(len(reasons("agentd/http/HttpTypes.h", '#include "host/Outcome.h"')), 1)
        self.assertEqual(len(reasons("agentd/client/AgentClient.cpp", '#include "orbis/json/JsonText.h"')), 1)

    def test_only_machines_know_the_simulator(self):
        for path in ["host/HostRuntime.cpp", "agentd/main.cpp", "kovactl/Connection.cpp", "kovactl/replay/ReplayRunner.cpp",
                     "kova/agentd/KovaManagerImpl.cpp"]:
            self.assertEqual(len(reasons(path, '#include "otxctl/sim/SimHost.h"')), 1, path)
            self.assertEqual(len(reasons(path, '#include "machines/SimulatedMachine.h"')), 1, path)
        self.assertEqual(reasons("machines/SimulatedMachine.cpp", '#include "otxctl/sim/SimHost.h"'), [])
        self.assertEqual(reasons("agentd/main.cpp", '#include "machines/Machines.h"'), [])

    def test_a_single_header_may_be_named_alone(self):
        self.assertEqual(reasons("otxctl/sim/SimHost.h", '#include "otxctl/fault/FaultRules.h"'), [])
        self.assertEqual(len(reasons("otxctl/sim/SimHost.cpp", '#include "otxctl/fault/CallRecorder.h"')), 1)

    def test_the_command_line_knows_an_agent_by_its_client(self):
        self.assertEqual(reasons("kovactl/Connection.cpp", '#include "agentd/client/AgentClient.h"'), [])
        self.assertEqual(len(reasons("kovactl/Connection.h", '#include "agentd/http/HttpClient.h"')), 1)

    def test_the_command_lines_folders_stand_in_a_row(self):
        self.assertEqual(len(reasons("kovactl/Print.cpp", '#include "kovactl/plan/Plan.h"')), 1)
        self.assertEqual(len(reasons("kovactl/Change.cpp", '#include "kovactl/sim/SimCommand.h"')), 1)
        self.assertEqual(len(reasons("kovactl/plan/Plan.cpp", '#include "kovactl/change/ChangeCommand.h"')), 1)
        self.assertEqual(len(reasons("kovactl/change/Consent.cpp", '#include "kovactl/cli/CommandLine.h"')), 1)
        self.assertEqual(reasons("kovactl/cli/main.cpp", '#include "kovactl/plan/PlanCommand.h"'), [])

    def test_the_rules_go_in_no_circle(self):
        self.assertEqual(circle_in(RULES), [])

    def test_a_circle_is_found_through_a_header_and_a_folder_in_between(self):
        self.assertEqual(circle_in({"a": ["b"], "b": []}), [])
        self.assertEqual(circle_in({"a": [], "b": ["a", "b/c"], "b/c": ["a", "b/X.h"]}), ["b", "b/c", "b"])
        self.assertEqual(circle_in({"z": ["a"], "a": ["b/in"], "b": ["c/X.h"], "c": ["a"]}), ["a", "b", "c", "a"])

    def test_the_line_is_named(self):
        self.assertEqual([n for n, _ in faults_of("tessa/Ref.h", '#pragma once\n#include "nox/Fwd.h"\n')], [2])


if __name__ == "__main__":
    unittest.main()
