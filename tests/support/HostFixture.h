// A host program round the plug-in, made of doubles and taken away again after each test.
//
// It installs every seam of the runtime (lock factory, default logger, application, authorization, panic
// handler, provider factory) and restores what was there. Mistakes with locks fail the test at its end.
// Knows nothing of the plug-in's insides, so tests of the built module may use it too.
#pragma once

#include <gtest/gtest.h>

#include "tessa/Panic.h"
#include "tests/support/FakeAgent.h"
#include "tests/support/FakeKernel.h"
#include "tests/support/RecordingLockFactory.h"
#include "tests/support/RecordingLogger.h"
#include "tests/support/Timeline.h"

namespace TestSupport {

// How the fixture's panic handler ends a process: with this status, after "panic: TEXT" and the lines of
// the logger on standard error, one per line: "log LEVEL FORMAT | ARGUMENT...".
inline constexpr int panicStatus = 70;

class HostFixture : public testing::Test {
 protected:
  HostFixture();
  ~HostFixture() override;
  void TearDown() override;

  Timeline _timeline;
  RecordingLockFactory _locks{_timeline};
  FakeKernel _kernel{_timeline};
  FakeApp _app{_timeline};
  Tessa::Ref<FakeStorageSystem> _storage;
  Tessa::Ref<FakeAuthorization> _authorization;
  Tessa::Ref<RecordingLogger> _logger;

 private:
  Tessa::System::SystemFactory* _factoryBefore = nullptr;
  Tessa::Ref<Tessa::Service::Logger> _loggerBefore;
  Tessa::Service::App* _appBefore = nullptr;
  Tessa::Ref<Tessa::Authorize::AuthorizeManager> _authorizationBefore;
  Tessa::PanicHandler _panicHandlerBefore = nullptr;
};

}  // namespace TestSupport
