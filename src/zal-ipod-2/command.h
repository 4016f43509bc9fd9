// The command pattern shared by every exported command: send with the ready test, build
// the argument value, store the pending-reply slot, wait, decode by the integer or the
// hash rule. Each exported command is one or two lines over these helpers, e.g.
//
//   int zal_ipod_set_position(zal_ipod_handle *h, int pos) {
//       return zal_cmd_send(h, ZAL_OP_SET_POSITION, zal_arg_int(pos), __func__);
//   }
//   int zal_ipod_set_position_sync(zal_ipod_handle *h, int pos) {
//       return zal_cmd_sync_int(h, zal_ipod_set_position(h, pos));
//   }
#pragma once

#include <cstdint>
#include <initializer_list>

#include <type_traits>

#include "zal-ipod-2/handle.h"
#include "zal-ipod-2/opcodes.h"
#include "zal-ipod-2/packet.h"

using zal_slot = uint16_t zal_pending_slots::*;

// Kind of a value, SERIALIZE_NONE for nullptr (without serialize_type's log record).
inline int zal_kind(const gval *v) {
    return v != nullptr ? static_cast<int>(v->type) : SERIALIZE_NONE;
}

// Sends one request and returns its tid, or 0 when nothing was sent.
//  - arg: the argument value, owned and freed here; nullptr for commands without one.
//  - function: the exported function's name (__func__) for commands with an argument,
//    nullptr for those without; a refused command with an argument logs
//    "not ready2 <function>" at warning priority.
//  - slot: the pending-reply slot that receives the tid, or nullptr.
//  - needs_ready: false for the few commands sent on any connected handle.
int zal_cmd_send(zal_ipod_handle *h, uint16_t opcode, gval *arg = nullptr,
                 const char *function = nullptr, zal_slot slot = nullptr, bool needs_ready = true);

// Argument builders; nullptr when out of memory (zal_cmd_send then sends nothing).
gval *zal_arg_int(int32_t v);
gval *zal_arg_bool(int v);
gval *zal_arg_string(const char *s);
gval *zal_arg_bytes(const void *p, uint32_t n);
// Opaque record sent as one struct value (fixed-layout records).
gval *zal_arg_struct(const void *p, uint32_t n);
// Array of integers, in parameter order (narrow parameters widened without sign first).
gval *zal_arg_ints(std::initializer_list<int32_t> items);
// Array of already built items (owned); nullptr and every item freed if one is nullptr.
gval *zal_arg_array(std::initializer_list<gval *> items);
// Array of integers followed by n strings (a null text travels as ""), built with its
// final size reserved: the filtered queries send their numbers, then a path of names.
gval *zal_arg_ints_strings(std::initializer_list<int32_t> ints, const char *const *strings,
                           int32_t n);
// Byte string of n bytes from a caller's (pointer, signed length) pair; nullptr for a
// negative length or a null pointer with bytes to copy, so that such a request is refused
// rather than read from where it should not be. n 0 gives an empty byte string.
gval *zal_arg_byte_string(const void *p, int32_t n);

// One argument item per parameter, by the parameter's C type: an integer parameter becomes
// an integer value widened by its own signedness (uint8_t 255 -> 255, int16_t -40 -> -40),
// a text becomes a string value, a gval * is taken as built. Mixed arrays of integers and
// texts are written zal_arg_list(a, b, text).
template <typename T>
gval *zal_arg_item(T v) {
    if constexpr (std::is_same_v<T, gval *>) {
        return v;
    } else if constexpr (std::is_same_v<T, const char *> || std::is_same_v<T, char *>) {
        return zal_arg_string(v);
    } else {
        static_assert(std::is_integral_v<T> && sizeof(T) <= sizeof(int32_t),
                      "argument items are 32-bit or narrower integers, texts or values");
        static_assert(!std::is_same_v<T, uint32_t>, "an unsigned 32-bit item does not fit");
        return zal_arg_int(static_cast<int32_t>(v));
    }
}
template <typename... T>
gval *zal_arg_list(T... items) {
    return zal_arg_array({zal_arg_item(items)...});
}

// Reads a reply hash (no "error" in it) into the handle; returns the command's result.
using zal_hash_reader = int32_t (*)(zal_ipod_handle *h, const gval *hash);

// Reads an integer under key of a hash; fallback when absent or not an integer.
int32_t zal_hash_int(const gval *hash, const char *key, int32_t fallback);
// String under key, or nullptr.
const char *zal_hash_string(const gval *hash, const char *key);
// True when the integer under key is present and non-zero.
bool zal_flag_set(const gval *hash, const char *key);
// Copies text into a buffer of size bytes (size > 0), cut to size - 1 characters and
// always terminated; a null text leaves an empty buffer. Never reads text past its NUL.
void zal_copy_text(char *buffer, std::size_t size, const char *text);

// The reply's decoded payload (the caller frees it); nullptr without a record, without a
// payload, or when the payload does not decode.
gval *zal_reply_value(const zal_ipod_reply *reply);
// The reply's payload when it decodes to a hash without "error" (the caller frees it);
// otherwise nullptr, after storing the text of an "error" key as the handle's error text.
gval *zal_reply_hash(zal_ipod_handle *h, const zal_ipod_reply *reply);

// Integer reply rule: integer -> itself; hash with "error" -> error text stored, -1;
// no record, no payload or anything else -> -1.
int32_t zal_decode_int(zal_ipod_handle *h, const zal_ipod_reply *reply);
// Hash reply rule: no record, no payload or not a hash -> -1; "error" -> error text
// stored, -1; otherwise read(h, hash).
int32_t zal_decode_hash(zal_ipod_handle *h, const zal_ipod_reply *reply, zal_hash_reader read);

// Waits for tid (the async form's result), decodes, releases the record.
int32_t zal_cmd_sync_int(zal_ipod_handle *h, int tid);
int32_t zal_cmd_sync_hash(zal_ipod_handle *h, int tid, zal_hash_reader read);
// Same with a decoder that reads the record itself.
using zal_record_decoder = int32_t (*)(zal_ipod_handle *h, const zal_ipod_reply *reply);
int32_t zal_cmd_sync(zal_ipod_handle *h, int tid, zal_record_decoder decode);
// Waits for tid and returns the decoded payload (the caller frees it), nullptr when no
// reply or no payload came; for replies whose value outlives the wait.
gval *zal_cmd_sync_value(zal_ipod_handle *h, int tid);

// Reads an integer under key of a hash; fallback when absent or not an integer.
int32_t zal_hash_int(const gval *hash, const char *key, int32_t fallback);
// String under key, or nullptr.
const char *zal_hash_string(const gval *hash, const char *key);

// For decoders that take other shapes than a hash too: stores the "error" text of a reply
// hash as the handle's error text; true when there was one.
bool zal_reply_error(zal_ipod_handle *h, const gval *hash);

// Hash rule with a reader that may carry context (a lambda writing the caller's outputs).
template <typename Read>
int32_t zal_decode_hash_with(zal_ipod_handle *h, const zal_ipod_reply *reply, Read &&read) {
    gval *hash = zal_reply_hash(h, reply);
    if (hash == nullptr) return -1;
    const int32_t result = read(h, static_cast<const gval *>(hash));
    serialize_free(hash);
    return result;
}

// Flagged hash reply: a hash answering a query carries a success flag under a key named
// like the request. -1 unless that flag is a non-zero integer (a reply without it failed
// too); then read(h, hash).
template <typename Read>
int32_t zal_decode_flagged(zal_ipod_handle *h, const zal_ipod_reply *reply, const char *flag,
                           Read &&read) {
    return zal_decode_hash_with(h, reply, [&](zal_ipod_handle *hh, const gval *hash) {
        return zal_flag_set(hash, flag) ? read(hh, hash) : int32_t{-1};
    });
}
// The integer under key of a flagged reply; -1 when the flag is off or the key missing.
int32_t zal_decode_flagged_int(zal_ipod_handle *h, const zal_ipod_reply *reply, const char *flag,
                               const char *key);

// Waits for tid, hands the record (nullptr when none came) to decode and releases it.
// For results other than int32_t (64-bit values, texts) and decoders with context.
template <typename Decode>
auto zal_cmd_sync_with(zal_ipod_handle *h, int tid, Decode &&decode) {
    zal_ipod_reply *reply =
        h != nullptr ? zal_ipod_wait_for_tid_ex(h, static_cast<uint16_t>(tid)) : nullptr;
    auto result = decode(h, static_cast<const zal_ipod_reply *>(reply));
    reply_record_free(reply);
    return result;
}
