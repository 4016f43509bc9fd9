// Internals of the value tree shared with the codec and the library.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>

#include "zal-ipod-2/serialize.h"

// A hash key that the decoder stores in the same heap block as the entry's value, after
// the value's own bytes. Such a key sits at an address that is 1 modulo 8, where malloc
// never puts a block, so the hash can tell it from a key copy of its own (strdup) by the
// address alone. The pointer-sized word before it (and the byte between) holds the start of
// the block, its holder. The holder is the entry's value until that value is replaced:
// the old value is then emptied but its block stays as the key's holder, so that a key
// pointer handed out earlier lives as long as the hash, as with a key copy of its own.
struct ValueKey {
    const char *bytes = nullptr;  // the key's text, length bytes, no NUL inside
    std::size_t length = 0;
    char *stored = nullptr;  // set by the constructor: the NUL-terminated copy in the block
};

inline bool value_key_in_value_block(const char *key) {
    return (reinterpret_cast<std::uintptr_t>(key) & 7u) == 1u;
}

// The block that holds a key for which value_key_in_value_block() is true.
inline void *value_key_holder(const char *key) {
    void *holder = nullptr;
    std::memcpy(&holder, key - 1 - sizeof holder, sizeof holder);
    return holder;
}

// Offset of a key copied into a block whose own bytes take `used`: the first offset past
// the holder word and one byte that is 1 modulo 8 (blocks start at multiples of 8).
inline std::size_t value_key_offset(std::size_t used) {
    return ((used + sizeof(void *) + 1 + 6) & ~std::size_t{7}) + 1;
}

static_assert(alignof(std::max_align_t) >= 8,
              "keys in value blocks rely on 8-byte malloc alignment");

// Allocates a value record with `used` bytes for the record and its payload, plus room for
// the key's copy when key is given (then written with its holder word, and key->stored
// set). Inline, as the decoder makes one per value.
inline gval *value_allocate(std::uint64_t used, ValueKey *key) {
    if (used > SIZE_MAX - 32) return nullptr;  // also keeps value_key_offset() from wrapping
    const std::size_t at = key != nullptr ? value_key_offset(static_cast<std::size_t>(used)) : 0;
    const std::uint64_t total = key != nullptr ? at + std::uint64_t{key->length} + 1 : used;
    if (total > SIZE_MAX) return nullptr;
    auto *v = static_cast<gval *>(std::malloc(static_cast<std::size_t>(total)));
    if (v == nullptr) return nullptr;
    if (key != nullptr) {
        char *stored = reinterpret_cast<char *>(v) + at;
        void *holder = v;
        std::memcpy(stored - 1 - sizeof holder, &holder, sizeof holder);
        std::memcpy(stored, key->bytes, key->length);
        stored[key->length] = '\0';
        key->stored = stored;
    }
    return v;
}

// A scalar or blob value in one allocation: the record followed by n payload bytes and a
// NUL, and the key's copy when key is given. p may be null only when n is 0.
inline gval *value_new_blob(uint32_t kind, const void *p, uint32_t n, ValueKey *key = nullptr) {
    if (n > 0 && p == nullptr) return nullptr;
    gval *v = value_allocate(std::uint64_t{sizeof(gval)} + n + 1, key);
    if (v == nullptr) return nullptr;
    auto *payload = reinterpret_cast<unsigned char *>(v + 1);
    v->type = kind;
    v->data = payload;
    v->len = n;
    if (n > 0) std::memcpy(payload, p, n);
    payload[n] = '\0';  // also for bytes: a stray read as text stops here
    return v;
}

// An empty array or hash whose capacity is what doubling from the default reaches for n
// entries, its record carrying the key's copy when key is given. NULL when out of memory.
gval *value_new_array(uint32_t n, ValueKey *key);
gval *value_new_hash(uint32_t n, ValueKey *key);

// Inserts the n items before index at (at <= count) with one move of the tail, taking
// ownership of them. False when out of memory: the items are freed, the array unchanged.
bool value_array_insert_many(gval *a, uint32_t at, gval *const *items, uint32_t n);

// Appends (key, value) to a hash known not to hold key; takes ownership of value (freed on
// failure). Returns the new entry's index, or -1.
int value_hash_append(gval *h, const char *key, gval *value);

// Same, for a value that carries its key in its block (key is that ValueKey's stored).
int value_hash_append_inline(gval *h, gval *value, char *key);

// Replaces the value of entry i, freeing the old one; the entry keeps its key (when the
// old value's block holds it, that block stays, emptied, as the key's holder).
void value_hash_replace(gval *h, int32_t i, gval *value);

// Same, for a value that carries an equal key in its block: the entry takes that key.
void value_hash_replace_inline(gval *h, int32_t i, gval *value, char *key);

// Removes the entry under key from a hash and hands its value to the caller (NULL when
// there is no such entry). The other entries keep their order.
gval *value_hash_take(gval *h, const char *key);

inline gval_array *value_array_body(const gval *a) {
    return static_cast<gval_array *>(a->data);
}
inline gval_hash *value_hash_body(const gval *h) {
    return static_cast<gval_hash *>(h->data);
}
