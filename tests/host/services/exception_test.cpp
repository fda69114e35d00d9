// SPDX-License-Identifier: MIT
#include "host/services/exception.h"

#include <gtest/gtest.h>

#include <memory>
#include <type_traits>
#include <typeinfo>

#include "host/services/autoptr.h"

namespace orin {
namespace {

TEST(Exception, CarriesMessageSourceFunctionAndLineInThatOrder) {
  const Exception e("what", "some/file", "void F()", 37);
  EXPECT_EQ("what", e.GetMessage());
  EXPECT_EQ("some/file", e.GetSourceFile());
  EXPECT_EQ("void F()", e.GetFunction());
  EXPECT_EQ(37u, e.GetLine());
  EXPECT_STREQ("what", e.what());
}

TEST(Exception, AssignmentReplacesAllFourFieldsOfAnEmptyHolder) {
  Exception holder("", "", "", 0);
  EXPECT_EQ("", holder.GetMessage());
  EXPECT_EQ(0u, holder.GetLine());
  {
    const DataException caught("bad", "a/b", "G()", 5);
    holder = caught;
  }
  EXPECT_EQ("bad", holder.GetMessage());
  EXPECT_EQ("a/b", holder.GetSourceFile());
  EXPECT_EQ("G()", holder.GetFunction());
  EXPECT_EQ(5u, holder.GetLine());
}

TEST(Exception, ThrowingTheHolderForgetsThatItCameFromADerivedType) {
  Exception holder("", "", "", 0);
  holder = DataException("bad", "a/b", "G()", 5);
  try {
    throw Exception(holder);
  } catch (const Exception& e) {
    EXPECT_EQ(typeid(Exception), typeid(e));
    EXPECT_EQ("bad", e.GetMessage());
  }
}

TEST(Exception, DataExceptionIsCaughtAsExceptionAndKeepsItsType) {
  try {
    throw DataException("bad", "a/b", "G()", 5);
  } catch (const Exception& e) {
    EXPECT_EQ(typeid(DataException), typeid(e));
    EXPECT_EQ(5u, e.GetLine());
  }
}

TEST(Exception, CopiesNeedNoMemory) {
  EXPECT_TRUE(std::is_nothrow_copy_constructible_v<Exception>);
  EXPECT_TRUE(std::is_nothrow_copy_assignable_v<Exception>);
  EXPECT_TRUE(std::is_nothrow_copy_constructible_v<DataException>);
}

TEST(Exception, DestructorsAreVirtual) {
  EXPECT_TRUE(std::has_virtual_destructor_v<Exception>);
  EXPECT_TRUE(std::has_virtual_destructor_v<DataException>);
  EXPECT_TRUE((std::is_base_of_v<Exception, DataException>));
}

TEST(HAutoPtr, ReleasesWhatItHoldsOnceThroughItsPolicy) {
  static int released;
  struct CountingPolicy {
    void operator()(int* held) const {
      ++released;
      delete held;
    }
  };
  released = 0;
  { const HAutoPtr<int, CountingPolicy> held(new int(1)); }
  { const HAutoPtr<int, CountingPolicy> nothing; }
  EXPECT_EQ(1, released);
}

}  // namespace
}  // namespace orin
