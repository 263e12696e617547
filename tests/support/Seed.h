// The seed of a random test: what a failure prints, and KOVA_SEED brings back.
//
//   const TestSupport::Seed seed;
//   std::mt19937 random(seed.Value());
#pragma once

#include <gtest/gtest.h>

#include <cstdlib>
#include <random>
#include <string>

namespace TestSupport {

// Every failure as long as it lives tells the seed.
class Seed {
 public:
  unsigned Value() const noexcept { return _value; }

 private:
  static unsigned FromEnvironment() {
    const char* const given = std::getenv("KOVA_SEED");
    return given != nullptr ? static_cast<unsigned>(std::strtoul(given, nullptr, 10))
                            : std::random_device()();
  }

  const unsigned _value = FromEnvironment();
  const testing::ScopedTrace _trace{__FILE__, __LINE__,
                                    "KOVA_SEED=" + std::to_string(_value) + " brings this back"};
};

}  // namespace TestSupport
