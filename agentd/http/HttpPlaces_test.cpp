#include "agentd/http/HttpPlaces.h"

#include <gtest/gtest.h>

#include <vector>

namespace Agentd {
namespace {

using Place = HttpPlaces::Place;

TEST(HttpPlaces, AreAsManyAsTheyAre) {
  HttpPlaces places(2, 2);
  const Place first = places.Take("a");
  EXPECT_EQ(places.WhyFull("b"), std::nullopt);
  const Place second = places.Take("b");
  EXPECT_EQ(places.Taken(), 2u);
  EXPECT_EQ(places.WhyFull("c"), HttpRefusal::Connections);
}

TEST(HttpPlaces, OneClientHasItsShareAndLeavesTheRestToOthers) {
  HttpPlaces places(5, 2);
  const Place first = places.Take("a");
  EXPECT_EQ(places.WhyFull("a"), std::nullopt);
  const Place second = places.Take("a");
  EXPECT_EQ(places.WhyFull("a"), HttpRefusal::ConnectionsOfPeer);
  EXPECT_EQ(places.WhyFull("b"), std::nullopt);
}

TEST(HttpPlaces, AClientWithoutANameMayHaveAll) {
  HttpPlaces places(3, 1);
  std::vector<Place> held;
  for (int i = 0; i < 3; ++i) {
    EXPECT_EQ(places.WhyFull(""), std::nullopt) << i;
    held.push_back(places.Take(""));
  }
  EXPECT_EQ(places.WhyFull(""), HttpRefusal::Connections);
}

TEST(HttpPlaces, OneThatGoesIsFreeAgain) {
  HttpPlaces places(1, 1);
  {
    Place place = places.Take("a");
    const Place moved = std::move(place);
    EXPECT_EQ(places.Taken(), 1u);
  }
  EXPECT_EQ(places.Taken(), 0u);
  EXPECT_EQ(places.WhyFull("a"), std::nullopt);
}

}  // namespace
}  // namespace Agentd
