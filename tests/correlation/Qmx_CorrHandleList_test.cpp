// The handle list of pooled objects: insertion order, one removal per occurrence, the return
// to the inline handle, and that one handle costs no allocation.
#include "Qmx_CorrHandleList.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <new>
#include <vector>

namespace {

// Every allocation of this test program, counted.
long g_allocations = 0;

}  // namespace

// Kept out of line: inlined into callers, the compiler would take the free() for a
// mismatch of the operator new it cannot see through.
__attribute__((noinline)) void* operator new(std::size_t size) {
    ++g_allocations;
    if (void* p = std::malloc(size ? size : 1)) return p;
    throw std::bad_alloc();
}
__attribute__((noinline)) void operator delete(void* p) noexcept { std::free(p); }
__attribute__((noinline)) void operator delete(void* p, std::size_t) noexcept { std::free(p); }

namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

// The allocations `step` makes.
template <class Step>
long AllocationsOf(Step step) {
    const long before = g_allocations;
    step();
    return g_allocations - before;
}

void Fill(Qmx_CorrHandleList& list, const std::vector<unsigned int>& handles) {
    for (unsigned int handle : handles) list.Add(handle);
}

TEST(CorrHandleList, OneHandleStaysInlineAndAllocatesNothing) {
    Qmx_CorrHandleList list;
    EXPECT_EQ(list.GetState(), Qmx_CorrHandleList::kEmpty);
    EXPECT_EQ(AllocationsOf([&] { list.Add(0xFFFFFFFFu); }), 0);
    EXPECT_EQ(list.GetState(), Qmx_CorrHandleList::kSingle);
    EXPECT_EQ(list.Get(0), 0xFFFFFFFFu);
    EXPECT_TRUE(list.Contains(0xFFFFFFFFu));
    EXPECT_FALSE(list.Contains(0x7FFFFFFFu));
    EXPECT_GT(AllocationsOf([&] { list.Add(128); }), 0);
    EXPECT_EQ(list.GetState(), Qmx_CorrHandleList::kArray);
    EXPECT_THAT(list.ToVector(), ElementsAre(0xFFFFFFFFu, 128u));
    EXPECT_EQ(sizeof(Qmx_CorrHandleList), 8u);
}

TEST(CorrHandleList, RemovingFromThreeReturnsToTheInlineHandle) {
    Qmx_CorrHandleList list;
    Fill(list, {7, 3, 9});
    EXPECT_TRUE(list.Remove(7));
    EXPECT_THAT(list.ToVector(), ElementsAre(3u, 9u));
    EXPECT_EQ(list.GetState(), Qmx_CorrHandleList::kArray);
    EXPECT_TRUE(list.Remove(3));
    EXPECT_EQ(list.GetState(), Qmx_CorrHandleList::kSingle);
    EXPECT_THAT(list.ToVector(), ElementsAre(9u));
    EXPECT_FALSE(list.Remove(3));
    EXPECT_TRUE(list.Remove(9));
    EXPECT_EQ(list.GetState(), Qmx_CorrHandleList::kEmpty);
    EXPECT_EQ(list.Size(), 0u);
    EXPECT_FALSE(list.Remove(9));
}

TEST(CorrHandleList, DuplicatesLeaveOneAtATime) {
    Qmx_CorrHandleList list;
    Fill(list, {5, 5});
    EXPECT_EQ(list.Size(), 2u);
    EXPECT_TRUE(list.Remove(5));
    EXPECT_EQ(list.GetState(), Qmx_CorrHandleList::kSingle);
    EXPECT_THAT(list.ToVector(), ElementsAre(5u));
    EXPECT_TRUE(list.Remove(5));
    EXPECT_THAT(list.ToVector(), IsEmpty());

    Fill(list, {4, 8, 4, 8});
    EXPECT_TRUE(list.Remove(8));
    EXPECT_THAT(list.ToVector(), ElementsAre(4u, 4u, 8u));
}

TEST(CorrHandleList, AssignReplacesTheContents) {
    Qmx_CorrHandleList list;
    Fill(list, {1000, 2000, 3000});
    list.Assign({11, 12, 13});
    EXPECT_THAT(list.ToVector(), ElementsAre(11u, 12u, 13u));
    const std::vector<unsigned int> one = {42};
    EXPECT_EQ(AllocationsOf([&] { list.Assign(one); }), 0);
    EXPECT_EQ(list.GetState(), Qmx_CorrHandleList::kSingle);
    EXPECT_EQ(list.Get(0), 42u);
    list.Assign({});
    EXPECT_EQ(list.GetState(), Qmx_CorrHandleList::kEmpty);
}

}  // namespace
