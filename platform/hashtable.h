// A hash table from keys to caller data, walked in insertion order (so that
// lists built by walking it come out the same on every run).
#pragma once

#include "tvx_base.h"

#include <cstddef>
#include <cstdint>

struct HashTable;

// Key types, ORed with HASH_FLAG_COPYKEY when the table should keep its own
// copy of string keys (otherwise the caller keeps each key alive for as long
// as its entry exists). 17 is case-insensitive string keys, copied.
enum : int {
  HASH_STRING_KEY = 0x00,   // NUL-terminated text, compared exactly
  HASH_ISTRING_KEY = 0x01,  // NUL-terminated text, ASCII case ignored
  HASH_FLAG_COPYKEY = 0x10,
};

// HashTableFreeEntryFn releases an entry's data when the entry is deleted,
// replaced or the table freed. Optional (null: data is not released).
typedef void (*HashTableFreeEntryFn)(void *clientData);
// HashTableForEachFn is called per entry; a non-zero return stops the walk.
typedef int (*HashTableForEachFn)(const void *key, void *clientData, void *ctx);

// HashTable_Alloc creates a table; `numBuckets` is a size hint. Never null.
HashTable *HashTable_Alloc(uint32_t numBuckets, int keyType, HashTableFreeEntryFn freeFn);
// HashTable_Free releases every entry (through the free function) and the
// table. Null is harmless.
void HashTable_Free(HashTable *ht);
// HashTable_Insert adds an entry; FALSE (and nothing changes) when the key
// is present already.
Bool HashTable_Insert(HashTable *ht, const void *key, void *clientData);
// HashTable_Lookup: TRUE when the key is present; its data goes to
// `out_data` (optional).
Bool HashTable_Lookup(const HashTable *ht, const void *key, void **out_data);
// HashTable_Remove removes the key's entry without releasing its data; the
// data goes to `out_data` (optional). FALSE when absent.
Bool HashTable_Remove(HashTable *ht, const void *key, void **out_data);
// HashTable_Clear deletes every entry.
void HashTable_Clear(HashTable *ht);
// HashTable_ForEach walks the entries in insertion order and returns the
// callback's first non-zero result, or 0. The callback must not change the
// table.
int HashTable_ForEach(const HashTable *ht, HashTableForEachFn fn, void *ctx);

#include "platform/unique.h"
namespace tvx {
TVX_MAKE_DELETER(HashTable, HashTable_Free);
}  // namespace tvx
