#include "host/AgentApp.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <thread>

#include "orbis/Types.h"

namespace Host {
namespace {

using Tessa::MakeRef;
using Tessa::Ref;

class Thing final : public Tessa::ObjectImpl {};

class Caller final : public Tessa::ObjectImpl, public Tessa::SessionMixin {};

class Token final : public Tessa::System::AuthTokenHelper {
 public:
  std::string GetToken() const override { return "secret"; }
};

TEST(AgentApp, FindsAnObjectByTheNameItWasSetUnder) {
  AgentApp app;
  const auto thing = MakeRef<Thing>();
  app.SetObject("storageSystem", thing);
  EXPECT_EQ(app.LookupObject("storageSystem").Get(), thing.Get());
  EXPECT_FALSE(app.LookupObject("networkSystem"));
}

TEST(AgentApp, ReplacesAnObjectAndLetsTheOldOneGo) {
  AgentApp app;
  const auto old = MakeRef<Thing>();
  const auto fresh = MakeRef<Thing>();
  app.SetObject("storageSystem", old);
  app.SetObject("storageSystem", fresh);
  EXPECT_EQ(app.LookupObject("storageSystem").Get(), fresh.Get());
  EXPECT_EQ(old->GetRefCount(), 1);
}

TEST(AgentApp, NullTakesANameAway) {
  AgentApp app;
  const auto thing = MakeRef<Thing>();
  app.SetObject("storageSystem", thing);
  app.SetObject("storageSystem", nullptr);
  EXPECT_FALSE(app.LookupObject("storageSystem"));
  EXPECT_EQ(thing->GetRefCount(), 1);
}

TEST(AgentApp, KeepsSessionsInOrderOfRegistration) {
  AgentApp app;
  const auto first = MakeRef<Caller>();
  const auto second = MakeRef<Caller>();
  app.RegisterSession(first);
  app.RegisterSession(second);
  const auto sessions = app.Sessions();
  ASSERT_EQ(sessions.size(), 2u);
  EXPECT_EQ(sessions[0]->GetId(), first->GetId());
  EXPECT_EQ(sessions[1]->GetId(), second->GetId());
}

TEST(AgentApp, IsReadWhileItIsWritten) {
  AgentApp app;
  std::thread writer([&app] {
    for (int i = 0; i < 1000; ++i) {
      app.SetObject("storageSystem", i % 2 == 0 ? MakeRef<Thing>() : nullptr);
    }
    app.SetObject("storageSystem", MakeRef<Thing>());
  });
  for (int i = 0; i < 1000; ++i) {
    const Ref<Tessa::Object> seen = app.LookupObject("storageSystem");
    if (seen) {
      EXPECT_GE(seen->GetRefCount(), 1);
    }
  }
  writer.join();
  EXPECT_TRUE(app.LookupObject("storageSystem"));
}

TEST(LocalAuthorization, LetsTheProgramsOwnPartsActAsBuiltInUsers) {
  LocalAuthorization authorization;
  const auto caller = MakeRef<Caller>();
  authorization.AddConnection(caller, "System", nullptr, true);
  EXPECT_EQ(caller->GetUserBinding(), "System");
}

TEST(LocalAuthorization, RefusesATokenAndNamesTheUser) {
  LocalAuthorization authorization;
  const auto caller = MakeRef<Caller>();
  try {
    authorization.AddConnection(caller, "operator", MakeRef<Token>(), false);
    FAIL() << "the token was let in";
  } catch (const Orbis::Fault::SystemError::Exception& refused) {
    const auto& fault = static_cast<const Orbis::Fault::SystemError&>(*refused.GetFault());
    EXPECT_THAT(fault.GetReason(), testing::HasSubstr("operator"));
    EXPECT_THAT(fault.GetReason(), testing::Not(testing::HasSubstr("secret")));
  }
  EXPECT_EQ(caller->GetUserBinding(), "");
}

}  // namespace
}  // namespace Host
