#include "tessa/App.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>
#include <vector>

#include "tessa/Authorize.h"
#include "tessa/Session.h"

namespace Tessa::Service {
namespace {

class Lamp final : public ObjectImpl {};
class Table final : public ObjectImpl {};

class FakeApp final : public App {
 public:
  FakeApp() { SetApp(this); }
  ~FakeApp() override { SetApp(nullptr); }

  Ref<Object> LookupObject(const std::string& name) const override {
    const auto found = objects.find(name);
    return found == objects.end() ? nullptr : found->second;
  }
  void RegisterSession(const Ref<Session>& session) override { sessions.push_back(session); }

  std::map<std::string, Ref<Object>> objects;
  std::vector<Ref<Session>> sessions;
};

TEST(TryLookupObject, FindsTheObjectOfThatName) {
  FakeApp app;
  const Ref<Lamp> lamp = MakeRef<Lamp>();
  app.objects["lamp"] = lamp;
  Ref<Lamp> found;
  TryLookupObject("lamp", found);
  EXPECT_TRUE(found == lamp);
  EXPECT_EQ(lamp->GetRefCount(), 3);
}

TEST(TryLookupObject, GivesNullForAnUnknownNameAndReleasesWhatWasThere) {
  const FakeApp app;
  const Ref<Lamp> before = MakeRef<Lamp>();
  Ref<Lamp> found = before;
  TryLookupObject("lamp", found);
  EXPECT_FALSE(found);
  EXPECT_EQ(before->GetRefCount(), 1);
}

TEST(TryLookupObject, ThrowsForAnotherTypeAndLeavesTheCallersRefAlone) {
  FakeApp app;
  const Ref<Table> table = MakeRef<Table>();
  app.objects["lamp"] = table;
  const Ref<Lamp> before = MakeRef<Lamp>();
  Ref<Lamp> found = before;
  EXPECT_THROW(TryLookupObject("lamp", found), TypeMismatchException);
  EXPECT_TRUE(found == before);
  EXPECT_EQ(table->GetRefCount(), 2) << "the lookup's own reference is gone";
}

TEST(TryLookupObject, GivesNullWithoutAnApplication) {
  ASSERT_EQ(GetApp(), nullptr);
  Ref<Lamp> found = MakeRef<Lamp>();
  TryLookupObject("lamp", found);
  EXPECT_FALSE(found);
}

TEST(App, OfTheProcessIsTheOneInstalled) {
  {
    const FakeApp app;
    EXPECT_EQ(GetApp(), &app);
  }
  EXPECT_EQ(GetApp(), nullptr);
}

class NobodyKnown final : public Authorize::AuthorizeManager {
 public:
  void AddConnection(const Ref<Session>&, const std::string&, const Ref<System::AuthTokenHelper>&,
                     bool) override {}
};

TEST(AuthorizeManager, OfTheProcessIsTheOneInstalled) {
  EXPECT_FALSE(Authorize::AuthorizeManager::GetInstance());
  const Ref<Authorize::AuthorizeManager> manager = MakeRef<NobodyKnown>();
  Authorize::AuthorizeManager::SetInstance(manager);
  EXPECT_TRUE(Authorize::AuthorizeManager::GetInstance() == manager);
  Authorize::AuthorizeManager::SetInstance(nullptr);
  EXPECT_FALSE(Authorize::AuthorizeManager::GetInstance());
  EXPECT_EQ(manager->GetRefCount(), 1);
}

}  // namespace
}  // namespace Tessa::Service
