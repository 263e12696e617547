#include "kovactl/sim/SimCommand.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <sstream>

#include "kovactl/testing/FakeHost.h"

namespace Kovactl {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class SimCommand : public testing::Test {
 protected:
  ExitStatus Set(const HostChange& change) { return RunSimSet(_host, change, _options, _out, _err); }
  ExitStatus Fault(const nlohmann::ordered_json& fault) {
    return RunSimFault(_host, fault, _options, _out, _err);
  }

  Testing::FakeHost _host;
  ChangeOptions _options;
  std::ostringstream _out;
  std::ostringstream _err;
};

TEST_F(SimCommand, ChangesADiskAndSaysWhatItSet) {
  EXPECT_EQ(Set({{"disk", {{"name", "naa.1"}, {"absent", true}, {"transport", "usb"}}}}), ExitStatus::Done);
  EXPECT_THAT(_host.changes,
              ElementsAre(R"(ChangeHost {"disk":{"name":"naa.1","absent":true,"transport":"usb"}})"));
  EXPECT_EQ(_out.str(), "naa.1: absent = true\nnaa.1: transport = \"usb\"\n");
}

TEST_F(SimCommand, ChangesTheHostItself) {
  EXPECT_EQ(Set({{"set", {{"autoMode", true}}}}), ExitStatus::Done);
  EXPECT_EQ(_out.str(), "host: autoMode = true\n");
}

TEST_F(SimCommand, PrintsTheChangeForScripts) {
  _options.output = "json";
  EXPECT_EQ(Set({{"set", {{"autoMode", true}}}}), ExitStatus::Done);
  EXPECT_EQ(_out.str(), "{\"set\":{\"autoMode\":true}}\n");
}

TEST_F(SimCommand, RefusesToSetNothing) {
  EXPECT_THROW(Set(HostChange::object()), BadInput);
  EXPECT_THROW(Set({{"disk", {{"name", "naa.1"}}}}), BadInput);
  EXPECT_THAT(_host.changes, IsEmpty());
}

TEST_F(SimCommand, ExplainsAChangeThatTheHostRefuses) {
  _host.changeAnswer.fault = Tessa::MakeRef<Orbis::Fault::InvalidArgument>("disk.name");
  EXPECT_EQ(Set({{"disk", {{"name", "naa.9"}, {"absent", true}}}}), ExitStatus::Fault);
  EXPECT_EQ(_out.str(), "");
  EXPECT_THAT(_err.str(), HasSubstr("does not fit the host"));
}

TEST_F(SimCommand, AddsAFaultToThoseThereAre) {
  _host.descriptions = {R"({"faults": [{"operation": "QueryDisks", "delayMs": 1}]})"};
  EXPECT_EQ(Fault({{"operation", "RemoveDisk"}, {"exception", "HostCtlException"}}), ExitStatus::Done);
  EXPECT_THAT(_host.changes,
              ElementsAre(R"(ChangeHost {"set":{"faults":[{"operation":"QueryDisks","delayMs":1},)"
                          R"({"operation":"RemoveDisk","exception":"HostCtlException"}]}})"));
}

TEST_F(SimCommand, AddsTheFirstFault) {
  _host.descriptions = {"{}"};
  EXPECT_EQ(Fault({{"operation", "RemoveDisk"}, {"delayMs", 5}}), ExitStatus::Done);
  EXPECT_EQ(_out.str(), R"(host: faults = [{"operation":"RemoveDisk","delayMs":5}])"
                        "\n");
}

TEST_F(SimCommand, RefusesAFaultThatDoesNothing) {
  _host.descriptions = {"{}"};
  EXPECT_THROW(Fault({{"operation", "RemoveDisk"}, {"call", 1}}), BadInput);
  EXPECT_THAT(_host.changes, IsEmpty());
}

TEST_F(SimCommand, ShowsTheHostsDescription) {
  _host.descriptions = {"{\n}\n"};
  EXPECT_EQ(RunSimShow(_host, _out), ExitStatus::Done);
  EXPECT_EQ(_out.str(), "{\n}\n");
}

TEST_F(SimCommand, SaysThatAChangeIsForgotten) {
  _options.forgotten = true;
  Set({{"set", {{"autoMode", true}}}});
  EXPECT_THAT(_err.str(), HasSubstr("--save"));
}

}  // namespace
}  // namespace Kovactl
