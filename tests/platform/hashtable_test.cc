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

  // Keys keep their first spelling, in the order they came.
  ASSERT_TRUE(HashTable_Insert(ht, "beta", Data(3)));
  std::vector<std::string> order;
  HashTable_ForEach(
      ht,
      [](const void *key, void *, void *ctx) {
        static_cast<std::vector<std::string> *>(ctx)->emplace_back(static_cast<const char *>(key));
        return 0;
      },
      &order);
  EXPECT_EQ(order, (std::vector<std::string>{"Alpha", "beta"}));
  HashTable_Free(ht);
  EXPECT_EQ(g_freed, 2);
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
  void *removed = nullptr;
  EXPECT_TRUE(HashTable_Remove(ht, "KEY", &removed));
  EXPECT_EQ(removed, &b);
  HashTable_Free(ht);
}

}  // namespace
