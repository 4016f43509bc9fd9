// Internals of the value tree shared with the codec.
#pragma once

#include "zal-ipod-2/serialize.h"

// A scalar or blob value in one allocation: the record followed by n payload bytes and a
// NUL. p may be null only when n is 0.
gval *value_new_blob(uint32_t kind, const void *p, uint32_t n);

// Appends (key, value) to a hash known not to hold key; takes ownership of value (freed on
// failure). Returns the new entry's index, or -1.
int value_hash_append(gval *h, const char *key, gval *value);

// Same, but key is a malloc'ed copy whose ownership passes to the hash (freed on failure).
int value_hash_append_owned(gval *h, char *key, gval *value);

// Makes room for n items (never shrinks); the capacity stays a power-of-two multiple of
// the default, as growth by doubling would have made it. False when out of memory.
bool value_array_presize(gval *a, uint32_t n);
bool value_hash_presize(gval *h, uint32_t n);

// Replaces the value of entry i (freeing the old one).
void value_hash_replace(gval *h, int32_t i, gval *value);

inline gval_array *value_array_body(const gval *a) {
    return static_cast<gval_array *>(a->data);
}
inline gval_hash *value_hash_body(const gval *h) {
    return static_cast<gval_hash *>(h->data);
}
