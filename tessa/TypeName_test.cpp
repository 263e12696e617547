#include "tessa/TypeName.h"

#include <gtest/gtest.h>

#include <stdexcept>
#include <string>

#include "tessa/Throwable.h"

namespace Tessa {
namespace {

template <class T>
struct Box {};

TEST(TypeName, IsWhatTheSourceSays) {
  EXPECT_EQ(TypeName(typeid(NotInitializedException)), "Tessa::NotInitializedException");
  EXPECT_EQ(TypeName(typeid(std::runtime_error)), "std::runtime_error");
  EXPECT_EQ(TypeName(typeid(int)), "int");
}

TEST(TypeName, LeavesOutTemplateArgumentsAndInlineNamespaces) {
  EXPECT_EQ(TypeName(typeid(Box<int>)), "Tessa::(anonymous namespace)::Box");
  EXPECT_EQ(TypeName(typeid(std::string)), "std::basic_string");
}

}  // namespace
}  // namespace Tessa
