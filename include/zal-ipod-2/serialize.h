/*
 * Values ("gvals") and their wire encoding.
 *
 * Every payload exchanged with the daemon is one value: a small typed tree of integers,
 * floats, strings, byte strings, opaque structs, arrays and string-keyed hashes. Build one
 * with the constructors, put it in containers (which take ownership), encode it with
 * serialize() and decode bytes with unserialize(). The creator of a top-level value frees
 * it with serialize_free(), which frees the whole tree.
 */
#ifndef ZAL_IPOD_2_SERIALIZE_H
#define ZAL_IPOD_2_SERIALIZE_H

#include <stdint.h>

#include "zal_export.h"

ZAL_BEGIN_DECLS

/* Kinds as serialize_type() returns them. */
enum {
    SERIALIZE_INT = 0,
    SERIALIZE_FLOAT = 1,
    SERIALIZE_STRING = 2,
    SERIALIZE_BYTES = 3,
    SERIALIZE_ARRAY = 4,
    SERIALIZE_HASH = 5,
    SERIALIZE_STRUCT = 6,
    SERIALIZE_NONE = 7 /* serialize_type() of a null value */
};

/*
 * A value. Scalars and blobs are one heap block: this record followed by the payload
 * (4 bytes for int and float; the payload bytes plus one byte for string, bytes and
 * struct, that byte being a NUL for string and struct). For arrays and hashes `data`
 * points at a separately allocated body.
 */
typedef struct gval {
    uint32_t type;  /* one of SERIALIZE_INT .. SERIALIZE_STRUCT */
    void *data;     /* payload, or the container body */
    uint32_t len;   /* 4 for int/float, payload bytes for string/bytes/struct */
} gval;

typedef struct gval_array {
    gval **items;
    int32_t capacity;
    int32_t count;
} gval_array;

typedef struct gval_hash {
    char **keys;    /* owned copies, insertion order */
    gval **values;  /* parallel to keys */
    int32_t capacity;
    int32_t count;
} gval_hash;

/* Constructors: each returns a new value owned by the caller, or NULL when out of memory. */
ZAL_API gval *serialize_int(int32_t v);
ZAL_API gval *serialize_float(float v);
ZAL_API gval *serialize_string(const char *s);
ZAL_API gval *serialize_bytes(const void *p, uint32_t n);
ZAL_API gval *serialize_struct(const void *p, uint32_t n);
ZAL_API gval *serialize_array(void);
ZAL_API gval *serialize_array_reserve(uint32_t n);
ZAL_API gval *serialize_hash(void);

/* Container bodies without a value record. */
ZAL_API gval_array *serialize_array_new(void);
ZAL_API gval_array *serialize_array_new_reserve(uint32_t n);
ZAL_API gval_hash *serialize_hash_new(void);
ZAL_API gval_hash *serialize_hash_new_reserve(uint32_t n);

/* Scalar and blob accessors; they do not check the kind (use serialize_type()). */
ZAL_API int serialize_type(const gval *v);
ZAL_API int32_t serialize_get_int(const gval *v);
ZAL_API float serialize_get_float(const gval *v);
ZAL_API const char *serialize_get_string(const gval *v);
ZAL_API const void *serialize_get_struct(const gval *v);
ZAL_API uint32_t serialize_get_struct_length(const gval *v);
ZAL_API const void *serialize_get_bytes(const gval *v, uint32_t *len);

/*
 * Arrays. Adding takes ownership of the item in every case: when the item cannot be
 * stored (out of memory, or a null array) it is freed and -1 is returned; 0 otherwise.
 * A null item is refused with -1.
 */
ZAL_API int serialize_array_count(const gval *a);
ZAL_API gval *serialize_array_get(const gval *a, uint32_t i);
ZAL_API int serialize_array_add(gval *a, gval *item);
/* Inserts at i < count; otherwise nothing happens and the item stays the caller's. */
ZAL_API void serialize_array_insert(gval *a, uint32_t i, gval *item);
/* Replaces (and frees) item i < count; otherwise the item stays the caller's. */
ZAL_API void serialize_array_set(gval *a, uint32_t i, gval *item);
ZAL_API void serialize_array_del(gval *a, uint32_t i);
ZAL_API void serialize_array_resize(gval *a, int32_t n);
ZAL_API void serialize_array_destroy(gval *a);

/*
 * Hashes: keys are unique, kept in insertion order; adding an existing key replaces its
 * value in place. Adding takes ownership of the value like serialize_array_add(), except
 * that a null key is ignored and leaves the value with the caller (result -1).
 */
ZAL_API int serialize_hash_count(const gval *h);
ZAL_API gval *serialize_hash_get(const gval *h, const char *key);
ZAL_API const char *serialize_hash_get_key(const gval *h, int32_t i);
ZAL_API int serialize_hash_add(gval *h, const char *key, gval *value);
ZAL_API void serialize_hash_destroy(gval *h);

/* Whole values. */
ZAL_API void serialize_free(gval *v);
ZAL_API gval *serialize_dup(const gval *v);

/*
 * Wire encoding. serialize() returns one malloc'ed buffer (release with free()) and its
 * size through len; NULL when out of memory or when the encoding would exceed 4 GiB.
 * unserialize() decodes the value at buf[0]; see the decoder's notes in the source for
 * how it treats hostile input. It never reads past len.
 */
ZAL_API unsigned char *serialize(const gval *v, uint32_t *len);
ZAL_API gval *unserialize(const unsigned char *buf, uint32_t len);

ZAL_API uint32_t serialize_pack_calc(const gval *v);
ZAL_API uint32_t serialize_int_pack_calc(void);
ZAL_API uint32_t serialize_float_pack_calc(void);
ZAL_API uint32_t serialize_string_pack_calc(const gval *v);
ZAL_API uint32_t serialize_bytes_pack_calc(const gval *v);
ZAL_API uint32_t serialize_array_pack_calc(const gval *v);
ZAL_API uint32_t serialize_hash_pack_calc(const gval *v);

ZAL_API uint32_t serialize_int_pack(unsigned char *out, const gval *v);
ZAL_API uint32_t serialize_float_pack(unsigned char *out, const gval *v);
ZAL_API uint32_t serialize_string_pack(unsigned char *out, const gval *v, int kind);
ZAL_API uint32_t serialize_array_pack(unsigned char *out, const gval *v);
ZAL_API uint32_t serialize_hash_pack(unsigned char *out, const gval *v);

/* Readers: p points after the tag, remaining counts the bytes from p; *consumed grows by
 * the bytes used after the tag. They return NULL when the input is too short. */
ZAL_API gval *serialize_int_unpack(const unsigned char *p, uint32_t remaining, uint32_t *consumed);
ZAL_API gval *serialize_float_unpack(const unsigned char *p, uint32_t remaining, uint32_t *consumed);
ZAL_API gval *serialize_string_unpack(const unsigned char *p, uint32_t remaining, uint32_t *consumed,
                                      int kind);
ZAL_API gval *serialize_array_unpack(const unsigned char *p, uint32_t remaining, uint32_t *consumed);
ZAL_API gval *serialize_hash_unpack(const unsigned char *p, uint32_t remaining, uint32_t *consumed);

/* Diagnostics: dumps into the Android log (debug priority) or on standard output. */
ZAL_API void serialize_print(const gval *v);
ZAL_API void serialize_print_depth(const gval *v, int depth);
ZAL_API void serialize_print_depth2(const gval *v, int depth);
ZAL_API void print_hex(const unsigned char *buf, int count);

ZAL_END_DECLS

#endif /* ZAL_IPOD_2_SERIALIZE_H */
