#include "tests/support/HostFixture.h"

#include <gmock/gmock.h>
#include <unistd.h>

#include <iostream>

#include "otxctl/ProviderFactory.h"

namespace TestSupport {

namespace {

// The panic handler is a plain function, so it finds the test's logger here.
RecordingLogger* currentLogger = nullptr;

void WriteDownAndExit(const char* text) {
  if (currentLogger != nullptr) {
    for (const LogLine& line : currentLogger->Lines()) {
      std::cerr << "log " << line << '\n';
    }
  }
  std::cerr << "panic: " << text << std::endl;
  _exit(panicStatus);
}

}  // namespace

HostFixture::HostFixture()
    : _storage(Tessa::MakeRef<FakeStorageSystem>(_timeline)),
      _authorization(Tessa::MakeRef<FakeAuthorization>(_timeline)),
      _logger(Tessa::MakeRef<RecordingLogger>()) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  _kernel.heldLocks = [this] { return _locks.HeldHere(); };
  _app.SetObject("storageSystem", _storage);
  currentLogger = _logger.Get();
  _factoryBefore = Tessa::System::SetSystemFactory(&_locks);
  _loggerBefore = Tessa::Service::GetDefaultLogger();
  Tessa::Service::SetDefaultLogger(_logger);
  _appBefore = Tessa::Service::SetApp(&_app);
  _authorizationBefore = Tessa::Authorize::AuthorizeManager::GetInstance();
  Tessa::Authorize::AuthorizeManager::SetInstance(_authorization);
  _panicHandlerBefore = Tessa::SetPanicHandler(&WriteDownAndExit);
  OtxCtl::Kova::SetProviderFactory([this] {
    _timeline.Note("GetKovaInfo");
    return _kernel.MakeProvider();
  });
}

HostFixture::~HostFixture() {
  OtxCtl::Kova::SetProviderFactory({});
  Tessa::SetPanicHandler(_panicHandlerBefore);
  Tessa::Authorize::AuthorizeManager::SetInstance(_authorizationBefore);
  Tessa::Service::SetApp(_appBefore);
  Tessa::Service::SetDefaultLogger(_loggerBefore);
  Tessa::System::SetSystemFactory(_factoryBefore);
  currentLogger = nullptr;
}

void HostFixture::TearDown() {
  EXPECT_THAT(_locks.Mistakes(), testing::IsEmpty());
  EXPECT_THAT(_locks.HeldHere(), testing::IsEmpty()) << "locks were left behind";
}

}  // namespace TestSupport
