// TWRequestScope: which settings hold where.
#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <thread>
#include <type_traits>

#include "tarnwick/net/request_settings.h"
#include "tarnwick/net/twrequestscope.h"

namespace {

using tarnwick::PeerText;

std::string Shown(const char* text) {
  return PeerText(text).Get();
}

bool Escapes() {
  return Shown("\n") == "\\x0A";
}

TEST(RequestScope, WithoutOneTheTextItselfIsLogged) {
  const char* const text = "a\n\x1b[2J\xff";
  EXPECT_EQ(PeerText(text).Get(), text);
  EXPECT_EQ(tarnwick::CurrentRequestSettings(), nullptr);
}

TEST(RequestScope, ANewOneChangesNothing) {
  const TWRequestScope scope;
  EXPECT_TRUE(scope.Valid());
  EXPECT_FALSE(Escapes());
}

TEST(RequestScope, EscapesFromTheSetterToItsEnd) {
  {
    TWRequestScope scope;
    scope.SetEscapedLog(true);
    EXPECT_EQ(Shown("a\r\nb"), "a\\x0D\\x0Ab");
    scope.SetEscapedLog(false);
    EXPECT_FALSE(Escapes());
    scope.SetEscapedLog(true);
  }
  EXPECT_FALSE(Escapes());
  EXPECT_EQ(tarnwick::CurrentRequestSettings(), nullptr);
}

TEST(RequestScope, AnInnerOneBeginsWithTheOutersSettingsAndTheOutersHoldAgainAfterIt) {
  TWRequestScope outer;
  outer.SetEscapedLog(true);
  {
    TWRequestScope inner;
    EXPECT_TRUE(Escapes());
    inner.SetEscapedLog(false);
    EXPECT_FALSE(Escapes());
    {
      TWRequestScope innermost;
      innermost.SetEscapedLog(true);
      EXPECT_TRUE(Escapes());
    }
    EXPECT_FALSE(Escapes());
  }
  EXPECT_TRUE(Escapes());
}

TEST(RequestScope, AnOuterOneMayEndFirst) {
  auto outer = std::make_unique<TWRequestScope>();
  auto middle = std::make_unique<TWRequestScope>();
  auto inner = std::make_unique<TWRequestScope>();
  inner->SetEscapedLog(true);
  middle.reset();
  EXPECT_TRUE(Escapes());
  outer.reset();
  EXPECT_TRUE(Escapes());
  inner.reset();
  EXPECT_EQ(tarnwick::CurrentRequestSettings(), nullptr);
}

TEST(RequestScope, HoldsForItsThreadAlone) {
  TWRequestScope scope;
  scope.SetEscapedLog(true);
  std::thread other([] {
    EXPECT_FALSE(Escapes());
    TWRequestScope own;
    EXPECT_FALSE(Escapes());
    own.SetEscapedLog(true);
    EXPECT_TRUE(Escapes());
    own.SetEscapedLog(false);
  });
  other.join();
  EXPECT_TRUE(Escapes());
}

TEST(RequestScope, IsNeitherCopiedNorMovedAndHoldsOnePointer) {
  EXPECT_FALSE(std::is_copy_constructible_v<TWRequestScope>);
  EXPECT_FALSE(std::is_move_constructible_v<TWRequestScope>);
  EXPECT_FALSE(std::is_copy_assignable_v<TWRequestScope>);
  EXPECT_FALSE(std::is_move_assignable_v<TWRequestScope>);
  EXPECT_TRUE(std::is_nothrow_default_constructible_v<TWRequestScope>);
  EXPECT_EQ(sizeof(TWRequestScope), sizeof(void*));
}

}  // namespace
