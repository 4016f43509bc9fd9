/**
 * @file
 * Values ("gvals") and their wire encoding.
 *
 * Every payload exchanged with the daemon is one value: a small typed tree of integers,
 * floats, strings, byte strings, opaque structs, arrays and string-keyed hashes. Build one
 * with the constructors, put it in containers (which take ownership), encode it with
 * serialize() and decode bytes with unserialize(). The creator of a top-level value frees
 * it with serialize_free(), which frees the whole tree.
 *
 * Threads: a value has no lock. Any thread may build, read, encode or free values, but one
 * value tree (or anything inside it) is used by one thread at a time. These functions never
 * call back and may be used from inside the library's callbacks; the data of an event
 * record belongs to the dispatcher until the callback returns.
 */
#ifndef ZAL_IPOD_2_SERIALIZE_H
#define ZAL_IPOD_2_SERIALIZE_H

#include <stdint.h>

#include "zal_export.h"

ZAL_BEGIN_DECLS

/** Kinds as serialize_type() returns them. */
enum {
    SERIALIZE_INT = 0,
    SERIALIZE_FLOAT = 1,
    SERIALIZE_STRING = 2,
    SERIALIZE_BYTES = 3,
    SERIALIZE_ARRAY = 4,
    SERIALIZE_HASH = 5,
    SERIALIZE_STRUCT = 6,
    SERIALIZE_NONE = 7 /**< serialize_type() of a null value */
};

/**
 * A value. Scalars and blobs are one heap block: this record followed by the payload
 * (4 bytes for int and float; the payload bytes plus one byte for string, bytes and
 * struct, that byte being a NUL for string and struct). For arrays and hashes `data`
 * points at a separately allocated body.
 */
typedef struct gval {
    uint32_t type; /**< one of SERIALIZE_INT .. SERIALIZE_STRUCT */
    void *data;    /**< payload, or the container body */
    uint32_t len;  /**< 4 for int/float, payload bytes for string/bytes/struct */
} gval;

/** Body of an array value: the items it owns, in order. */
typedef struct gval_array {
    gval **items;     /**< count items, owned */
    int32_t capacity; /**< slots allocated in items */
    int32_t count;    /**< items held */
} gval_array;

/** Body of a hash value: unique keys in insertion order and the values they own. */
typedef struct gval_hash {
    char **keys;      /**< owned copies, insertion order */
    gval **values;    /**< parallel to keys, owned */
    int32_t capacity; /**< slots allocated in keys and values */
    int32_t count;    /**< entries held */
} gval_hash;

/** @name Constructors
 * Each returns a new value owned by the caller, or NULL when out of memory.
 * @{ */
/** A new value of the kind the name says (int, float, string copy, bytes copy, struct
 * copy, empty array, empty array with room for n items, empty hash); NULL when out of
 * memory. */
ZAL_API gval *serialize_int(int32_t v);
ZAL_API gval *serialize_float(float v);
ZAL_API gval *serialize_string(const char *s);
ZAL_API gval *serialize_bytes(const void *p, uint32_t n);
ZAL_API gval *serialize_struct(const void *p, uint32_t n);
ZAL_API gval *serialize_array(void);
ZAL_API gval *serialize_array_reserve(uint32_t n);
ZAL_API gval *serialize_hash(void);
/** @} */

/** @name Container bodies without a value record
 * @{ */
/** A new empty body (with room for n entries for the _reserve forms); NULL when out of
 * memory. */
ZAL_API gval_array *serialize_array_new(void);
ZAL_API gval_array *serialize_array_new_reserve(uint32_t n);
ZAL_API gval_hash *serialize_hash_new(void);
ZAL_API gval_hash *serialize_hash_new_reserve(uint32_t n);
/** @} */

/** Kind of the value (SERIALIZE_*), SERIALIZE_NONE for NULL. */
ZAL_API int serialize_type(const gval *v);
/** @name Scalar and blob accessors
 * They do not check the kind (use serialize_type()).
 * @{ */
/** The payload of the value read as the kind the name says. */
ZAL_API int32_t serialize_get_int(const gval *v);
ZAL_API float serialize_get_float(const gval *v);
ZAL_API const char *serialize_get_string(const gval *v);
ZAL_API const void *serialize_get_struct(const gval *v);
ZAL_API uint32_t serialize_get_struct_length(const gval *v);
ZAL_API const void *serialize_get_bytes(const gval *v, uint32_t *len);
/** @} */

/** @name Arrays
 * Adding takes ownership of the item in every case: when the item cannot be
 * stored (out of memory, or a null array) it is freed and -1 is returned; 0 otherwise.
 * A null item is refused with -1.
 * @{ */
/** Number of items; 0 for anything but an array. */
ZAL_API int serialize_array_count(const gval *a);
/** Item i (still owned by the array), or NULL. */
ZAL_API gval *serialize_array_get(const gval *a, uint32_t i);
/** Appends item, taking ownership; 0, or -1 (the item freed) when it cannot be stored. */
ZAL_API int serialize_array_add(gval *a, gval *item);
/** Inserts at i < count; otherwise nothing happens and the item stays the caller's. */
ZAL_API void serialize_array_insert(gval *a, uint32_t i, gval *item);
/** Replaces (and frees) item i < count; otherwise the item stays the caller's. */
ZAL_API void serialize_array_set(gval *a, uint32_t i, gval *item);
/** Frees item i < count and closes the gap. */
ZAL_API void serialize_array_del(gval *a, uint32_t i);
/** Grows the room of the array to n items (never shrinks it; the count is unchanged). */
ZAL_API void serialize_array_resize(gval *a, int32_t n);
/** Frees the items and the body; the value record itself stays (its data becomes NULL). */
ZAL_API void serialize_array_destroy(gval *a);
/** @} */

/** @name Hashes
 * Keys are unique, kept in insertion order; adding an existing key replaces its
 * value in place. Adding takes ownership of the value like serialize_array_add(), except
 * that a null key is ignored and leaves the value with the caller (result -1).
 * @{ */
/** Number of entries; 0 for anything but a hash. */
ZAL_API int serialize_hash_count(const gval *h);
/** The value under key (still owned by the hash), or NULL. */
ZAL_API gval *serialize_hash_get(const gval *h, const char *key);
/** The key of entry i in insertion order, or NULL. */
ZAL_API const char *serialize_hash_get_key(const gval *h, int32_t i);
/** Adds or replaces the value under key (a copy of key is kept); 0, or -1. */
ZAL_API int serialize_hash_add(gval *h, const char *key, gval *value);
/** Frees the entries and the body; the value record itself stays (its data becomes NULL). */
ZAL_API void serialize_hash_destroy(gval *h);
/** @} */

/** Frees a value and everything inside it; NULL is ignored. */
ZAL_API void serialize_free(gval *v);
/** A deep copy owned by the caller; NULL when out of memory or for NULL. */
ZAL_API gval *serialize_dup(const gval *v);

/** @name Wire encoding serialize() returns one malloc'ed buffer (release with free()) and its
 * size through len; NULL when out of memory or when the encoding would exceed 4 GiB.
 * unserialize() decodes the value at buf[0]; see the decoder's notes in the source for
 * how it treats hostile input. It never reads past len.
 * @{ */
/** Encodes v into a new buffer (release with free()); its size goes to *len. */
ZAL_API unsigned char *serialize(const gval *v, uint32_t *len);
/** Decodes the value at buf[0] into a new value owned by the caller; NULL when the bytes
 * are not one valid value. */
ZAL_API gval *unserialize(const unsigned char *buf, uint32_t len);
/** @} */

/** @name Encoder parts
 * The pieces serialize() is made of, for callers that encode into their own buffer.
 * @{ */
/** Bytes the encoding of the value takes (for the kind the name says), tag included;
 * serialize_pack_calc() saturates at UINT32_MAX. */
ZAL_API uint32_t serialize_pack_calc(const gval *v);
ZAL_API uint32_t serialize_int_pack_calc(void);
ZAL_API uint32_t serialize_float_pack_calc(void);
ZAL_API uint32_t serialize_string_pack_calc(const gval *v);
ZAL_API uint32_t serialize_bytes_pack_calc(const gval *v);
ZAL_API uint32_t serialize_array_pack_calc(const gval *v);
ZAL_API uint32_t serialize_hash_pack_calc(const gval *v);
/** @} */

/** @name Encoder parts: writers
 * @{ */
/** Writes the encoding of v (tag first) at out, which has room for the matching _calc
 * size; returns the bytes written. serialize_string_pack() writes string, bytes or struct
 * as kind says. */
ZAL_API uint32_t serialize_int_pack(unsigned char *out, const gval *v);
ZAL_API uint32_t serialize_float_pack(unsigned char *out, const gval *v);
ZAL_API uint32_t serialize_string_pack(unsigned char *out, const gval *v, int kind);
ZAL_API uint32_t serialize_array_pack(unsigned char *out, const gval *v);
ZAL_API uint32_t serialize_hash_pack(unsigned char *out, const gval *v);
/** @} */

/** @name Decoder parts: readers
 * @{ */
/** Readers: p points after the tag, remaining counts the bytes from p; *consumed grows by
 * the bytes used after the tag. They return NULL when the input is too short. */
ZAL_API gval *serialize_int_unpack(const unsigned char *p, uint32_t remaining, uint32_t *consumed);
ZAL_API gval *serialize_float_unpack(const unsigned char *p, uint32_t remaining,
                                     uint32_t *consumed);
ZAL_API gval *serialize_string_unpack(const unsigned char *p, uint32_t remaining,
                                      uint32_t *consumed, int kind);
ZAL_API gval *serialize_array_unpack(const unsigned char *p, uint32_t remaining,
                                     uint32_t *consumed);
ZAL_API gval *serialize_hash_unpack(const unsigned char *p, uint32_t remaining, uint32_t *consumed);
/** @} */

/** @name Diagnostics
 * Dumps into the Android log (debug priority) or on standard output.
 * @{ */
/** Dumps the value into the Android log at debug priority. */
ZAL_API void serialize_print(const gval *v);
/** Same, indented by depth levels. */
ZAL_API void serialize_print_depth(const gval *v, int depth);
/** Dumps the value on standard output, indented by depth levels. */
ZAL_API void serialize_print_depth2(const gval *v, int depth);
/** Dumps count bytes of buf in hexadecimal on standard output. */
ZAL_API void print_hex(const unsigned char *buf, int count);
/** @} */

ZAL_END_DECLS

#endif /* ZAL_IPOD_2_SERIALIZE_H */
