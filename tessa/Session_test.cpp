#include "tessa/Session.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <set>
#include <thread>
#include <utility>
#include <vector>

namespace Tessa {
namespace {

using std::chrono::hours;
using std::chrono::seconds;
using std::chrono::system_clock;
using ::testing::MatchesRegex;

class PlainSession final : public SessionMixin, public ObjectImpl {
 public:
  using SessionMixin::Lifetime;
  PlainSession() = default;
  explicit PlainSession(Lifetime lifetime) : SessionMixin(std::move(lifetime)) {}
};

class Thing final : public ObjectImpl {};

Ref<Session> ASession() {
  return MakeRef<PlainSession>();
}
Ref<Session> ASessionThatIdlesFor(seconds idle) {
  return MakeRef<PlainSession>(PlainSession::Lifetime{idle, std::nullopt});
}
Ref<Session> ASessionUntil(Session::UtcTime until) {
  return MakeRef<PlainSession>(PlainSession::Lifetime{std::nullopt, until});
}

TEST(Session, LivesForeverUnlessToldOtherwise) {
  const Ref<Session> session = ASession();
  EXPECT_FALSE(session->HasExpired());
  EXPECT_EQ(session->GetExpirationDate(), std::nullopt);
  EXPECT_EQ(session->GetConfiguredIdleTimeout(), std::nullopt);
}

TEST(Session, ExpiresAtItsDate) {
  const Session::UtcTime past = system_clock::now() - hours(1);
  EXPECT_TRUE(ASessionUntil(past)->HasExpired());
  EXPECT_EQ(ASessionUntil(past)->GetExpirationDate(), past);
  EXPECT_FALSE(ASessionUntil(system_clock::now() + hours(1))->HasExpired());
}

TEST(Session, ExpiresWhenIdleUnlessItIsLeased) {
  const Ref<Session> session = ASessionThatIdlesFor(seconds(0));
  EXPECT_EQ(session->GetConfiguredIdleTimeout(), seconds(0));
  EXPECT_TRUE(session->HasExpired());
  session->AddLease("task-1");
  EXPECT_FALSE(session->HasExpired());
  session->RemoveLease("task-1");
  EXPECT_TRUE(session->HasExpired());
  EXPECT_FALSE(ASessionThatIdlesFor(hours(1))->HasExpired());
}

TEST(Session, IsNotKeptPastItsDateByALease) {
  const Ref<Session> session = ASessionUntil(system_clock::now() - hours(1));
  session->AddLease("task-1");
  EXPECT_TRUE(session->HasExpired());
}

TEST(Session, CountsALeaseOfOneNameOnce) {
  const Ref<Session> session = ASession();
  EXPECT_FALSE(session->HasLease());
  session->AddLease("task-1");
  session->AddLease("task-1");
  session->AddLease("task-2");
  EXPECT_EQ(session->GetStats().leases, 2);
  session->RemoveLease("task-1");
  EXPECT_TRUE(session->HasLease());
  session->RemoveLease("never added");
  session->RemoveLease("task-2");
  EXPECT_FALSE(session->HasLease());
}

TEST(Session, ThatIsClosedHasExpiredAndLetsGoOfWhatItKept) {
  const Ref<Session> session = ASession();
  const Ref<Thing> thing = MakeRef<Thing>();
  session->SetObject("thing", thing);
  session->AddLease("task-1");
  EXPECT_FALSE(session->IsClosed());
  session->CloseSession();
  EXPECT_TRUE(session->IsClosed());
  EXPECT_TRUE(session->HasExpired());
  EXPECT_FALSE(session->HasLease());
  EXPECT_FALSE(session->LookupObject("thing"));
  EXPECT_EQ(thing->GetRefCount(), 1);
}

TEST(Session, KeepsTheDataOfTheAuthorizationLayer) {
  const Ref<Session> session = ASession();
  EXPECT_FALSE(session->GetAuthData());
  const Ref<Thing> data = MakeRef<Thing>();
  session->SetAuthData(data);
  EXPECT_TRUE(session->GetAuthData() == data);
  session->SetAuthData(nullptr);
  EXPECT_FALSE(session->GetAuthData());
  EXPECT_EQ(data->GetRefCount(), 1);
}

TEST(Session, KeepsObjectsByName) {
  const Ref<Session> session = ASession();
  const Ref<Thing> first = MakeRef<Thing>();
  const Ref<Thing> second = MakeRef<Thing>();
  EXPECT_FALSE(session->LookupObject("thing"));
  session->SetObject("thing", first);
  EXPECT_TRUE(session->LookupObject("thing") == first);
  session->SetObject("thing", second);
  EXPECT_TRUE(session->LookupObject("thing") == second);
  EXPECT_EQ(first->GetRefCount(), 1);
  EXPECT_EQ(session->GetStats().objects, 1);
  session->SetObject("thing", nullptr);
  session->SetObject("never there", nullptr);
  EXPECT_FALSE(session->LookupObject("thing"));
  EXPECT_EQ(session->GetStats().objects, 0);
}

TEST(Session, IsAuthenticatedOnceItActsAsAUser) {
  const Ref<Session> session = ASession();
  EXPECT_FALSE(session->IsAuthenticated());
  EXPECT_EQ(session->GetUserBinding(), "");
  session->SetUserBinding("System");
  EXPECT_TRUE(session->IsAuthenticated());
  EXPECT_EQ(session->GetUserBinding(), "System");
}

TEST(Session, RemembersItsClientsAgentAndLanguage) {
  const Ref<Session> session = ASession();
  EXPECT_EQ(session->GetUserAgent(), "");
  EXPECT_EQ(session->GetLocale(), "en");
  EXPECT_EQ(session->GetBindingInfo(), "") << "made in the process";
  session->SetUserAgent("kovactl");
  session->SetLocale("de");
  EXPECT_EQ(session->GetUserAgent(), "kovactl");
  EXPECT_EQ(session->GetLocale(), "de");
}

TEST(Session, KnowsWhenItWasMadeAndLastUsed) {
  const auto utcBefore = system_clock::now();
  const auto before = std::chrono::steady_clock::now();
  const Ref<Session> session = ASession();
  EXPECT_GE(session->LastLoginTimeUtc(), utcBefore);
  EXPECT_GE(session->LastActiveTime(), before);
  EXPECT_EQ(session->LastActiveTimeUtc(), session->LastLoginTimeUtc());
  const auto made = session->LastActiveTime();
  const auto login = session->LastLoginTimeUtc();
  session->UpdateLastActive();
  EXPECT_GE(session->LastActiveTime(), made);
  EXPECT_GE(session->LastActiveTimeUtc(), login);
  EXPECT_EQ(session->LastLoginTimeUtc(), login);
  EXPECT_EQ(session->GetStats().updates, 1);
}

TEST(Session, HasAnIdAndANonceOfItsOwn) {
  std::set<std::string> seen;
  for (int i = 0; i < 100; ++i) {
    const Ref<Session> session = ASession();
    EXPECT_THAT(session->GetId(), MatchesRegex("[0-9a-f]{32}"));
    EXPECT_THAT(session->GetSessionNonce(), MatchesRegex("[0-9a-f]{32}"));
    EXPECT_EQ(session->GetId(), session->GetId());
    EXPECT_TRUE(seen.insert(session->GetId()).second);
    EXPECT_TRUE(seen.insert(session->GetSessionNonce()).second);
  }
}

TEST(Session, StartsWithEmptyStatistics) {
  const Session::Stats stats = ASession()->GetStats();
  EXPECT_EQ(stats.leases, 0);
  EXPECT_EQ(stats.objects, 0);
  EXPECT_EQ(stats.updates, 0);
}

TEST(Session, ServesManyThreadsAtOnce) {
  constexpr int threadCount = 4;
  constexpr int rounds = 500;
  const Ref<Session> session = ASessionThatIdlesFor(hours(1));
  std::vector<std::thread> threads;
  for (int i = 0; i < threadCount; ++i) {
    threads.emplace_back([&session, name = "thread-" + std::to_string(i)] {
      for (int round = 0; round < rounds; ++round) {
        session->AddLease(name);
        session->SetObject(name, MakeRef<Thing>());
        session->SetAuthData(session->LookupObject(name));
        session->SetUserAgent(session->GetUserAgent() == name ? "" : name);
        session->SetUserBinding(session->GetUserBinding() + "x");
        session->SetLocale(session->GetLocale());
        session->UpdateLastActive();
        EXPECT_FALSE(session->HasExpired());
        session->RemoveLease(name);
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(session->GetStats().updates, threadCount * rounds);
  EXPECT_EQ(session->GetStats().objects, threadCount);
  EXPECT_FALSE(session->HasLease());
}

}  // namespace
}  // namespace Tessa
