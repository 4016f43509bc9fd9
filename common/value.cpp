// The value tree: constructors, accessors, arrays, hashes and the deep free.
//
// Scalars and blobs live in one heap block (record, payload, NUL). Containers are a
// record plus a body whose pointer arrays start at capacity 8 and double when full.
// A hash keeps its own copy of each key; for entries made by the decoder that copy sits in
// the value's block (see ValueKey), which saves an allocation per entry. Replacing such an
// entry's value empties the old value but keeps its block for the key.
// Accessors tolerate a null value or one of another kind by returning a neutral result
// (0, NULL, -1) and changing nothing; the wire decoder never produces such calls, but
// application code handed a reply it did not expect must not crash on it.
#include <climits>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>

#include "common/log.h"
#include "common/value_internal.h"

namespace {

constexpr int32_t kDefaultCapacity = 8;

bool is_kind(const gval *v, uint32_t kind) {
    return v != nullptr && v->type == kind;
}

gval *new_container(uint32_t kind, void *body, ValueKey *key = nullptr) {
    if (body == nullptr) return nullptr;
    gval *v = value_allocate(sizeof(gval), key);
    if (v == nullptr) return nullptr;
    v->type = kind;
    v->data = body;
    v->len = 0;
    return v;
}

// Releases the storage of an entry's key that value (the entry's value, which stays) does
// not hold: the hash's own copy, or the emptied block of a value replaced before.
void release_key(char *key, const gval *value) {
    if (!value_key_in_value_block(key))
        std::free(key);
    else if (void *holder = value_key_holder(key); holder != value)
        std::free(holder);
}

// Releases an entry: its key and its value.
void release_entry(char *key, gval *value) {
    release_key(key, value);
    serialize_free(value);
}

// Grows a pointer array to new_capacity slots; false (array unchanged) on failure.
template <class T>
bool grow(T **slots, int32_t new_capacity) {
    void *p = std::realloc(*slots, sizeof(T) * static_cast<std::size_t>(new_capacity));
    if (p == nullptr) return false;
    *slots = static_cast<T *>(p);
    return true;
}

// Capacity after doubling; a zero capacity starts again at the default.
int32_t doubled(int32_t capacity) {
    if (capacity <= 0) return kDefaultCapacity;
    if (capacity > INT32_MAX / 2) return -1;
    return capacity * 2;
}

bool hash_make_room(gval_hash *body) {
    if (body->count < body->capacity) return true;
    int32_t cap = doubled(body->count);
    if (cap < 0) return false;
    if (!grow(&body->keys, cap) || !grow(&body->values, cap)) return false;
    body->capacity = cap;
    return true;
}

}  // namespace

static int hash_append(gval *h, char *key, gval *value) {
    gval_hash *body = value_hash_body(h);
    if (key == nullptr || !hash_make_room(body)) {
        release_entry(key, value);
        return -1;
    }
    body->keys[body->count] = key;
    body->values[body->count] = value;
    return body->count++;
}

int value_hash_append(gval *h, const char *key, gval *value) {
    return hash_append(h, strdup(key), value);
}

int value_hash_append_inline(gval *h, gval *value, char *key) {
    return hash_append(h, key, value);
}

// Capacity that doubling from the default reaches for n items; -1 when out of range.
static int32_t grown_capacity(int32_t capacity, uint32_t n) {
    int32_t cap = capacity > 0 ? capacity : kDefaultCapacity;
    while (static_cast<uint32_t>(cap) < n) {
        cap = doubled(cap);
        if (cap < 0) return -1;
    }
    return cap;
}

// An empty array or hash with room for capacity entries; NULL when out of memory.
static gval *array_of_capacity(uint32_t capacity, ValueKey *key) {
    gval_array *body = serialize_array_new_reserve(capacity);
    gval *v = new_container(SERIALIZE_ARRAY, body, key);
    if (v == nullptr && body != nullptr) {
        std::free(body->items);
        std::free(body);
    }
    return v;
}

static gval *hash_of_capacity(uint32_t capacity, ValueKey *key) {
    gval_hash *body = serialize_hash_new_reserve(capacity);
    gval *v = new_container(SERIALIZE_HASH, body, key);
    if (v == nullptr && body != nullptr) {
        std::free(body->keys);
        std::free(body->values);
        std::free(body);
    }
    return v;
}

gval *value_new_array(uint32_t n, ValueKey *key) {
    int32_t cap = grown_capacity(kDefaultCapacity, n);
    return cap < 0 ? nullptr : array_of_capacity(static_cast<uint32_t>(cap), key);
}

gval *value_new_hash(uint32_t n, ValueKey *key) {
    int32_t cap = grown_capacity(kDefaultCapacity, n);
    return cap < 0 ? nullptr : hash_of_capacity(static_cast<uint32_t>(cap), key);
}

bool value_array_insert_many(gval *a, uint32_t at, gval *const *items, uint32_t n) {
    gval_array *body = value_array_body(a);
    const auto count = static_cast<uint32_t>(body->count);
    const std::uint64_t needed = std::uint64_t{count} + n;
    int32_t cap =
        needed > INT32_MAX ? -1 : grown_capacity(body->capacity, static_cast<uint32_t>(needed));
    if (at > count || cap < 0 || (cap > body->capacity && !grow(&body->items, cap))) {
        for (uint32_t i = 0; i < n; ++i) serialize_free(items[i]);
        return false;
    }
    body->capacity = cap > body->capacity ? cap : body->capacity;
    std::memmove(&body->items[at + n], &body->items[at], sizeof(gval *) * (count - at));
    std::memcpy(&body->items[at], items, sizeof(gval *) * n);
    body->count += static_cast<int32_t>(n);
    return true;
}

void value_hash_replace(gval *h, int32_t i, gval *value) {
    gval_hash *body = value_hash_body(h);
    gval *old = body->values[i];
    const char *key = body->keys[i];
    if (value_key_in_value_block(key) && value_key_holder(key) == old) {
        // The old value's block holds the key: empty it and keep the block for the key.
        if (old->type == SERIALIZE_ARRAY) serialize_array_destroy(old);
        if (old->type == SERIALIZE_HASH) serialize_hash_destroy(old);
    } else {
        serialize_free(old);
    }
    body->values[i] = value;
}

void value_hash_replace_inline(gval *h, int32_t i, gval *value, char *key) {
    gval_hash *body = value_hash_body(h);
    release_entry(body->keys[i], body->values[i]);
    body->keys[i] = key;
    body->values[i] = value;
}

gval *value_hash_take(gval *h, const char *key) {
    if (!is_kind(h, SERIALIZE_HASH) || key == nullptr) return nullptr;
    gval_hash *body = value_hash_body(h);
    for (int32_t i = 0; i < body->count; ++i) {
        if (std::strcmp(body->keys[i], key) != 0) continue;
        gval *value = body->values[i];
        release_key(body->keys[i], value);
        const auto tail = static_cast<std::size_t>(body->count - i - 1);
        std::memmove(&body->keys[i], &body->keys[i + 1], sizeof(char *) * tail);
        std::memmove(&body->values[i], &body->values[i + 1], sizeof(gval *) * tail);
        body->count--;
        return value;
    }
    return nullptr;
}

extern "C" {

ZAL_API gval *serialize_int(int32_t v) {
    return value_new_blob(SERIALIZE_INT, &v, 4);
}

ZAL_API gval *serialize_float(float v) {
    static_assert(sizeof(float) == 4, "floats travel as 32 bits");
    return value_new_blob(SERIALIZE_FLOAT, &v, 4);
}

ZAL_API gval *serialize_string(const char *s) {
    if (s == nullptr) s = "";
    std::size_t n = std::strlen(s);
    if (n > UINT32_MAX) return nullptr;
    return value_new_blob(SERIALIZE_STRING, s, static_cast<uint32_t>(n));
}

ZAL_API gval *serialize_bytes(const void *p, uint32_t n) {
    return value_new_blob(SERIALIZE_BYTES, p, n);
}

ZAL_API gval *serialize_struct(const void *p, uint32_t n) {
    return value_new_blob(SERIALIZE_STRUCT, p, n);
}

ZAL_API gval_array *serialize_array_new_reserve(uint32_t n) {
    if (n > INT32_MAX) return nullptr;
    auto *body = static_cast<gval_array *>(std::malloc(sizeof(gval_array)));
    if (body == nullptr) return nullptr;
    *body = gval_array{};
    if (n > 0) {
        body->items = static_cast<gval **>(std::malloc(sizeof(gval *) * n));
        if (body->items == nullptr) {
            std::free(body);
            return nullptr;
        }
    }
    body->capacity = static_cast<int32_t>(n);
    return body;
}

ZAL_API gval_array *serialize_array_new(void) {
    return serialize_array_new_reserve(kDefaultCapacity);
}

ZAL_API gval_hash *serialize_hash_new_reserve(uint32_t n) {
    if (n > INT32_MAX) return nullptr;
    auto *body = static_cast<gval_hash *>(std::malloc(sizeof(gval_hash)));
    if (body == nullptr) return nullptr;
    *body = gval_hash{};
    if (n > 0) {
        body->keys = static_cast<char **>(std::malloc(sizeof(char *) * n));
        body->values = static_cast<gval **>(std::malloc(sizeof(gval *) * n));
        if (body->keys == nullptr || body->values == nullptr) {
            std::free(body->keys);
            std::free(body->values);
            std::free(body);
            return nullptr;
        }
    }
    body->capacity = static_cast<int32_t>(n);
    return body;
}

ZAL_API gval_hash *serialize_hash_new(void) {
    return serialize_hash_new_reserve(kDefaultCapacity);
}

ZAL_API gval *serialize_array_reserve(uint32_t n) {
    return array_of_capacity(n, nullptr);
}

ZAL_API gval *serialize_array(void) {
    return serialize_array_reserve(kDefaultCapacity);
}

ZAL_API gval *serialize_hash(void) {
    return hash_of_capacity(kDefaultCapacity, nullptr);
}

ZAL_API int serialize_type(const gval *v) {
    if (v == nullptr) {
        ZAL_LOGD("%s: gval is NULL!", "serialize_type");
        return SERIALIZE_NONE;
    }
    return static_cast<int>(v->type);
}

ZAL_API int32_t serialize_get_int(const gval *v) {
    int32_t out = 0;
    if (v != nullptr && v->data != nullptr) std::memcpy(&out, v->data, sizeof out);
    return out;
}

ZAL_API float serialize_get_float(const gval *v) {
    float out = 0.0f;
    if (v != nullptr && v->data != nullptr) std::memcpy(&out, v->data, sizeof out);
    return out;
}

ZAL_API const char *serialize_get_string(const gval *v) {
    return v != nullptr ? static_cast<const char *>(v->data) : nullptr;
}

ZAL_API const void *serialize_get_struct(const gval *v) {
    return v != nullptr ? v->data : nullptr;
}

ZAL_API uint32_t serialize_get_struct_length(const gval *v) {
    return v != nullptr ? v->len : 0;
}

ZAL_API const void *serialize_get_bytes(const gval *v, uint32_t *len) {
    if (len != nullptr) *len = v != nullptr ? v->len : 0;
    return v != nullptr ? v->data : nullptr;
}

ZAL_API int serialize_array_count(const gval *a) {
    return is_kind(a, SERIALIZE_ARRAY) ? value_array_body(a)->count : 0;
}

ZAL_API gval *serialize_array_get(const gval *a, uint32_t i) {
    if (!is_kind(a, SERIALIZE_ARRAY)) return nullptr;
    gval_array *body = value_array_body(a);
    return i < static_cast<uint32_t>(body->count) ? body->items[i] : nullptr;
}

ZAL_API void serialize_array_resize(gval *a, int32_t n) {
    if (!is_kind(a, SERIALIZE_ARRAY)) return;
    gval_array *body = value_array_body(a);
    if (n > body->capacity && grow(&body->items, n)) body->capacity = n;
}

// Makes room for one more item; false when the array cannot grow.
static bool array_make_room(gval *a) {
    gval_array *body = value_array_body(a);
    if (body->count < body->capacity) return true;
    int32_t cap = doubled(body->capacity);
    if (cap < 0) return false;
    serialize_array_resize(a, cap);
    return body->count < body->capacity;
}

ZAL_API int serialize_array_add(gval *a, gval *item) {
    if (item == nullptr) return -1;
    if (!is_kind(a, SERIALIZE_ARRAY) || !array_make_room(a)) {
        serialize_free(item);
        return -1;
    }
    gval_array *body = value_array_body(a);
    body->items[body->count++] = item;
    return 0;
}

ZAL_API void serialize_array_insert(gval *a, uint32_t i, gval *item) {
    if (item == nullptr || !is_kind(a, SERIALIZE_ARRAY)) return;
    gval_array *body = value_array_body(a);
    if (i >= static_cast<uint32_t>(body->count)) return;
    if (!array_make_room(a)) {
        serialize_free(item);
        return;
    }
    std::memmove(&body->items[i + 1], &body->items[i],
                 sizeof(gval *) * (static_cast<uint32_t>(body->count) - i));
    body->items[i] = item;
    body->count++;
}

ZAL_API void serialize_array_set(gval *a, uint32_t i, gval *item) {
    if (item == nullptr || !is_kind(a, SERIALIZE_ARRAY)) return;
    gval_array *body = value_array_body(a);
    if (i >= static_cast<uint32_t>(body->count)) return;
    serialize_free(body->items[i]);
    body->items[i] = item;
}

ZAL_API void serialize_array_del(gval *a, uint32_t i) {
    if (!is_kind(a, SERIALIZE_ARRAY)) return;
    gval_array *body = value_array_body(a);
    if (i >= static_cast<uint32_t>(body->count)) return;
    serialize_free(body->items[i]);
    std::memmove(&body->items[i], &body->items[i + 1],
                 sizeof(gval *) * (static_cast<uint32_t>(body->count) - i - 1));
    body->count--;
}

ZAL_API void serialize_array_destroy(gval *a) {
    if (!is_kind(a, SERIALIZE_ARRAY) || a->data == nullptr) return;
    gval_array *body = value_array_body(a);
    for (int32_t i = 0; i < body->count; ++i) serialize_free(body->items[i]);
    std::free(body->items);
    std::free(body);
    a->data = nullptr;
}

ZAL_API int serialize_hash_count(const gval *h) {
    return is_kind(h, SERIALIZE_HASH) ? value_hash_body(h)->count : 0;
}

ZAL_API gval *serialize_hash_get(const gval *h, const char *key) {
    if (!is_kind(h, SERIALIZE_HASH) || key == nullptr) return nullptr;
    gval_hash *body = value_hash_body(h);
    for (int32_t i = 0; i < body->count; ++i)
        if (std::strcmp(body->keys[i], key) == 0) return body->values[i];
    return nullptr;
}

ZAL_API const char *serialize_hash_get_key(const gval *h, int32_t i) {
    if (!is_kind(h, SERIALIZE_HASH)) return nullptr;
    gval_hash *body = value_hash_body(h);
    return i >= 0 && i < body->count ? body->keys[i] : nullptr;
}

ZAL_API int serialize_hash_add(gval *h, const char *key, gval *value) {
    if (key == nullptr || value == nullptr) return -1;
    if (!is_kind(h, SERIALIZE_HASH)) {
        serialize_free(value);
        return -1;
    }
    gval_hash *body = value_hash_body(h);
    for (int32_t i = 0; i < body->count; ++i) {
        if (std::strcmp(body->keys[i], key) == 0) {
            value_hash_replace(h, i, value);
            return 0;
        }
    }
    return value_hash_append(h, key, value) < 0 ? -1 : 0;
}

ZAL_API void serialize_hash_destroy(gval *h) {
    if (!is_kind(h, SERIALIZE_HASH) || h->data == nullptr) return;
    gval_hash *body = value_hash_body(h);
    for (int32_t i = 0; i < body->count; ++i) release_entry(body->keys[i], body->values[i]);
    std::free(body->keys);
    std::free(body->values);
    std::free(body);
    h->data = nullptr;
}

ZAL_API void serialize_free(gval *v) {
    switch (serialize_type(v)) {
        case SERIALIZE_NONE:
            return;
        case SERIALIZE_ARRAY:
            serialize_array_destroy(v);
            break;
        case SERIALIZE_HASH:
            serialize_hash_destroy(v);
            break;
        default:
            break;
    }
    std::free(v);
}

ZAL_API gval *serialize_dup(const gval *v) {
    uint32_t len = 0;
    unsigned char *buf = serialize(v, &len);
    if (buf == nullptr) return nullptr;
    gval *copy = unserialize(buf, len);
    std::free(buf);
    return copy;
}

}  // extern "C"
