// In which order the built module makes its statics when it is loaded. They go down in reverse.
//
// Whatever a module makes it registers for its end with the language's runtime; this program stands between
// them and listens.

#include <dlfcn.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <string_view>
#include <vector>

namespace {

using Destroy = void (*)(void*);

struct Registration {
  Destroy destroy;
  void* object;
};

constexpr std::size_t mostRegistrations = 64;
Registration registrations[mostRegistrations];
std::size_t count = 0;
bool isListening = false;

}  // namespace

extern "C" int __cxa_atexit(Destroy destroy, void* object, void* module) noexcept {
  if (isListening && count < mostRegistrations) {
    registrations[count++] = {destroy, object};
  }
  static const auto next = reinterpret_cast<int (*)(Destroy, void*, void*)>(dlsym(RTLD_NEXT, "__cxa_atexit"));
  return next(destroy, object, module);
}

namespace {

// The name by which the code at that place is known, or nothing.
std::string_view NameOf(Destroy destroy) {
  Dl_info info = {};
  dladdr(reinterpret_cast<void*>(destroy), &info);
  return info.dli_sname != nullptr ? info.dli_sname : "";
}

// As in "text: all", "streams", "several texts", "reference to nothing".
std::string Describe(const Registration& made) {
  if (NameOf(made.destroy).find("ios_base4Init") != std::string_view::npos) {
    return "streams";
  }
  if (made.object == nullptr) {
    return "several texts";  // an array has a function of its own to take it down
  }
  if (*static_cast<void* const*>(made.object) == nullptr) {
    return "reference to nothing";  // a text never begins with that: it points to its characters
  }
  return "text: " + *static_cast<const std::string*>(made.object);
}

TEST(ModuleStatics, AreMadeInTheirOrderWithTheManagerLast) {
  isListening = true;
  void* const module = dlopen(KOVA_MODULE, RTLD_NOW | RTLD_LOCAL);
  isListening = false;
  ASSERT_NE(module, nullptr) << dlerror();
  std::vector<std::string> made;
  for (std::size_t i = 0; i < count; ++i) {
    made.push_back(Describe(registrations[i]));
  }
  EXPECT_THAT(
      made, testing::ElementsAre("reference to nothing", "reference to nothing",  // logger and session
                                 "text: 224.1.2.3", "text: FF19:0:0:0:0:1:2:3", "text: 224.2.3.4",
                                 "text: FF19:0:0:0:0:2:3:4", "text: Can not remove last HDD", "text: witness",
                                 "text: kova", "text: all", "streams", "several texts",
                                 "text: ::", "text: /etc/nimbra/ike", "text: newreno",
                                 "reference to nothing"));  // the manager
  dlclose(module);
}

}  // namespace
