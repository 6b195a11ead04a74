#include "platform/hashtable.h"

#include <cstring>
#include <list>
#include <string>
#include <unordered_map>

#include "platform/log.h"

struct HashTable {
  struct Entry {
    const void *key;     // what callers see: their pointer or the table's copy
    std::string copy;    // the copy, when the table keeps one
    void *data;
  };
  int keyType = HASH_STRING_KEY;
  bool copyKeys = false;
  HashTableFreeEntryFn freeFn = nullptr;
  std::list<Entry> order;  // insertion order
  std::unordered_map<std::string, std::list<Entry>::iterator> index;

  std::string Normal(const void *key) const {
    std::string s(static_cast<const char *>(key));
    if (keyType == HASH_ISTRING_KEY) {
      for (char &c : s) {
        if (c >= 'A' && c <= 'Z') c = static_cast<char>(c - 'A' + 'a');
      }
    }
    return s;
  }

  void Release(void *data) const {
    if (freeFn != nullptr) freeFn(data);
  }
};

HashTable *HashTable_Alloc(uint32_t numBuckets, int keyType, HashTableFreeEntryFn freeFn) {
  int type = keyType & ~HASH_FLAG_COPYKEY;
  if (type != HASH_STRING_KEY && type != HASH_ISTRING_KEY) {
    Panic("HashTable_Alloc: unknown key type %d\n", keyType);
  }
  auto *ht = new HashTable;
  ht->keyType = type;
  ht->copyKeys = (keyType & HASH_FLAG_COPYKEY) != 0;
  ht->freeFn = freeFn;
  ht->index.reserve(numBuckets);
  return ht;
}

void HashTable_Free(HashTable *ht) {
  if (ht == nullptr) return;
  HashTable_Clear(ht);
  delete ht;
}

Bool HashTable_Insert(HashTable *ht, const void *key, void *clientData) {
  std::string normal = ht->Normal(key);
  if (ht->index.count(normal) != 0) return FALSE;
  ht->order.push_back({key, std::string(), clientData});
  auto it = std::prev(ht->order.end());
  if (ht->copyKeys) {
    it->copy = static_cast<const char *>(key);
    it->key = it->copy.c_str();
  }
  ht->index.emplace(std::move(normal), it);
  return TRUE;
}

Bool HashTable_Lookup(const HashTable *ht, const void *key, void **out_data) {
  auto found = ht->index.find(ht->Normal(key));
  if (found == ht->index.end()) return FALSE;
  if (out_data != nullptr) *out_data = found->second->data;
  return TRUE;
}

Bool HashTable_Remove(HashTable *ht, const void *key, void **out_data) {
  auto found = ht->index.find(ht->Normal(key));
  if (found == ht->index.end()) return FALSE;
  if (out_data != nullptr) *out_data = found->second->data;
  ht->order.erase(found->second);
  ht->index.erase(found);
  return TRUE;
}

void HashTable_Clear(HashTable *ht) {
  // Unhook everything first, so a free function that looks at the table
  // finds it consistent (empty).
  std::list<HashTable::Entry> entries;
  entries.swap(ht->order);
  ht->index.clear();
  for (auto &e : entries) ht->Release(e.data);
}

int HashTable_ForEach(const HashTable *ht, HashTableForEachFn fn, void *ctx) {
  for (const auto &e : ht->order) {
    int rc = fn(e.key, e.data, ctx);
    if (rc != 0) return rc;
  }
  return 0;
}
