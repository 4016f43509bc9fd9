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

#include "zal-ipod-2/handle.h"
#include "zal-ipod-2/opcodes.h"

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

// Reads a reply hash (no "error" in it) into the handle; returns the command's result.
using zal_hash_reader = int32_t (*)(zal_ipod_handle *h, const gval *hash);

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
