#include "platform/hashtable.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

namespace {

int g_freed = 0;
void FreeCounted(void *p) {
  g_freed++;
  std::free(p);
}

void *Data(int v) {
  int *p = static_cast<int *>(std::malloc(sizeof(int)));
  *p = v;
  return p;
}

int Value(const HashTable *ht, const char *key) {
  void *p = nullptr;
  return HashTable_Lookup(ht, key, &p) ? *static_cast<int *>(p) : -1;
}

TEST(HashTable, CaselessCopiedKeysFindEveryCase) {
  g_freed = 0;
  HashTable *ht = HashTable_Alloc(128, HASH_ISTRING_KEY | HASH_FLAG_COPYKEY, FreeCounted);
  {
    std::string key = "Alpha";
    ASSERT_TRUE(HashTable_Insert(ht, key.c_str(), Data(1)));
    key = "overwritten";  // the table kept its own copy
  }
  EXPECT_EQ(Value(ht, "alpha"), 1);
  EXPECT_EQ(Value(ht, "ALPHA"), 1);
  void *extra = Data(2);
  EXPECT_FALSE(HashTable_Insert(ht, "aLPHA", extra));
  std::free(extra);
  EXPECT_EQ(HashTable_GetNumElements(ht), 1u);

  // Replace releases the old data and keeps the first spelling and place.
  ASSERT_TRUE(HashTable_Insert(ht, "beta", Data(3)));
  EXPECT_TRUE(HashTable_ReplaceOrInsert(ht, "ALPHA", Data(4)));
  EXPECT_EQ(g_freed, 1);
  std::vector<std::string> order;
  HashTable_ForEach(
      ht,
      [](const void *key, void *, void *ctx) {
        static_cast<std::vector<std::string> *>(ctx)->emplace_back(static_cast<const char *>(key));
        return 0;
      },
      &order);
  EXPECT_EQ(order, (std::vector<std::string>{"Alpha", "beta"}));
  EXPECT_EQ(Value(ht, "alpha"), 4);

  EXPECT_TRUE(HashTable_Delete(ht, "BETA"));
  EXPECT_FALSE(HashTable_Delete(ht, "beta"));
  EXPECT_EQ(g_freed, 2);
  HashTable_Free(ht);
  EXPECT_EQ(g_freed, 3);
}

TEST(HashTable, ExactKeysDistinguishCase) {
  HashTable *ht = HashTable_Alloc(8, HASH_STRING_KEY, nullptr);
  static const char kA[] = "key", kB[] = "KEY";
  int a = 1, b = 2;
  ASSERT_TRUE(HashTable_Insert(ht, kA, &a));
  ASSERT_TRUE(HashTable_Insert(ht, kB, &b));
  EXPECT_EQ(Value(ht, "key"), 1);
  EXPECT_EQ(Value(ht, "KEY"), 2);
  EXPECT_EQ(Value(ht, "Key"), -1);
  EXPECT_EQ(HashTable_LookupOrInsert(ht, "key", &b), &a);
  void *removed = nullptr;
  EXPECT_TRUE(HashTable_Remove(ht, "KEY", &removed));
  EXPECT_EQ(removed, &b);
  HashTable_Free(ht);
}

TEST(HashTable, ForEachStopsOnNonZero) {
  HashTable *ht = HashTable_Alloc(4, HASH_INT_KEY, nullptr);
  for (uintptr_t k = 1; k <= 5; k++) HashTable_Insert(ht, reinterpret_cast<void *>(k), nullptr);
  int seen = 0;
  int rc = HashTable_ForEach(
      ht, [](const void *, void *, void *ctx) { return ++*static_cast<int *>(ctx) == 3 ? 7 : 0; },
      &seen);
  EXPECT_EQ(rc, 7);
  EXPECT_EQ(seen, 3);
  HashTable_Clear(ht);
  EXPECT_EQ(HashTable_GetNumElements(ht), 0u);
  HashTable_Free(ht);
}

}  // namespace
