// Shared helpers of the command pattern (see command.h).
#include "zal-ipod-2/command.h"

#include <android/log.h>

#include <cstring>

#include "common/log.h"
#include "zal-ipod-2/packet.h"

int zal_cmd_send(zal_ipod_handle *h, uint16_t opcode, gval *arg, const char *function,
                 zal_slot slot, bool needs_ready) {
    if (h == nullptr) {
        serialize_free(arg);
        return 0;
    }
    if (needs_ready && h->ready.load() == 0) {
        if (function != nullptr) ZAL_LOGW("not ready2 %s\n", function);
        serialize_free(arg);
        return 0;
    }
    if (function != nullptr && arg == nullptr) {
        ZAL_LOGE("%s: the argument could not be built (out of memory or invalid)\n", function);
        return 0;
    }
    zal_ipod_send_record record{};
    record.opcode = opcode;
    record.payload = arg;
    zal_ipod_send_packet(h, &record);
    serialize_free(arg);
    if (slot != nullptr) h->slots.*slot = record.tid;
    return record.tid;
}

gval *zal_arg_int(int32_t v) {
    return serialize_int(v);
}
gval *zal_arg_bool(int v) {
    return serialize_int(v != 0 ? 1 : 0);
}
gval *zal_arg_string(const char *s) {
    return serialize_string(s != nullptr ? s : "");
}
gval *zal_arg_bytes(const void *p, uint32_t n) {
    return serialize_bytes(p, n);
}
gval *zal_arg_struct(const void *p, uint32_t n) {
    return serialize_struct(p, n);
}

gval *zal_arg_byte_string(const void *p, int32_t n) {
    if (n < 0 || (p == nullptr && n > 0)) return nullptr;
    return serialize_bytes(n > 0 ? p : "", static_cast<uint32_t>(n));
}

gval *zal_arg_ints(std::initializer_list<int32_t> items) {
    gval *array = serialize_array_reserve(static_cast<uint32_t>(items.size()));
    if (array == nullptr) return nullptr;
    for (int32_t v : items) {
        if (serialize_array_add(array, serialize_int(v)) != 0) {
            serialize_free(array);
            return nullptr;
        }
    }
    return array;
}

gval *zal_arg_array(std::initializer_list<gval *> items) {
    gval *array = serialize_array_reserve(static_cast<uint32_t>(items.size()));
    bool complete = array != nullptr;
    for (gval *item : items) {
        if (item == nullptr) {
            complete = false;
            continue;
        }
        if (!complete || serialize_array_add(array, item) != 0) {
            if (complete)
                complete = false;  // add freed the item
            else
                serialize_free(item);
        }
    }
    if (!complete) {
        serialize_free(array);
        return nullptr;
    }
    return array;
}

gval *zal_arg_ints_strings(std::initializer_list<int32_t> ints, const char *const *strings,
                           int32_t n) {
    if (n < 0 || (strings == nullptr && n > 0)) return nullptr;
    gval *array =
        serialize_array_reserve(static_cast<uint32_t>(ints.size()) + static_cast<uint32_t>(n));
    if (array == nullptr) return nullptr;
    for (int32_t v : ints) {
        if (serialize_array_add(array, serialize_int(v)) != 0) {
            serialize_free(array);
            return nullptr;
        }
    }
    for (int32_t i = 0; i < n; ++i) {
        const char *s = strings[i] != nullptr ? strings[i] : "";
        if (serialize_array_add(array, serialize_string(s)) != 0) {
            serialize_free(array);
            return nullptr;
        }
    }
    return array;
}

namespace {
// Stores the "error" text of a hash; true when there was one.
bool take_error(zal_ipod_handle *h, const gval *hash) {
    gval *error = serialize_hash_get(hash, "error");
    if (error == nullptr) return false;
    zal_set_error_message(h,
                          zal_kind(error) == SERIALIZE_STRING ? serialize_get_string(error) : "");
    return true;
}
}  // namespace

gval *zal_reply_value(const zal_ipod_reply *reply) {
    if (reply == nullptr || reply->length == 0 || reply->payload == nullptr) return nullptr;
    return unserialize(reply->payload, reply->length);
}

int32_t zal_decode_int(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    gval *v = zal_reply_value(reply);
    int32_t result = -1;
    if (zal_kind(v) == SERIALIZE_INT)
        result = serialize_get_int(v);
    else if (zal_kind(v) == SERIALIZE_HASH)
        take_error(h, v);
    serialize_free(v);
    return result;
}

gval *zal_reply_hash(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    gval *v = zal_reply_value(reply);
    if (zal_kind(v) == SERIALIZE_HASH && !take_error(h, v)) return v;
    serialize_free(v);
    return nullptr;
}

int32_t zal_decode_hash(zal_ipod_handle *h, const zal_ipod_reply *reply, zal_hash_reader read) {
    return zal_decode_hash_with(h, reply, read);
}

int32_t zal_decode_flagged_int(zal_ipod_handle *h, const zal_ipod_reply *reply, const char *flag,
                               const char *key) {
    return zal_decode_flagged(h, reply, flag, [key](zal_ipod_handle *, const gval *hash) {
        return zal_hash_int(hash, key, -1);
    });
}

int32_t zal_cmd_sync(zal_ipod_handle *h, int tid, zal_record_decoder decode) {
    if (h == nullptr) return -1;
    zal_ipod_reply *reply = zal_ipod_wait_for_tid_ex(h, static_cast<uint16_t>(tid));
    int32_t result = decode(h, reply);
    reply_record_free(reply);
    return result;
}

gval *zal_cmd_sync_value(zal_ipod_handle *h, int tid) {
    if (h == nullptr) return nullptr;
    zal_ipod_reply *reply = zal_ipod_wait_for_tid_ex(h, static_cast<uint16_t>(tid));
    gval *v = zal_reply_value(reply);
    reply_record_free(reply);
    return v;
}

int32_t zal_cmd_sync_int(zal_ipod_handle *h, int tid) {
    return zal_cmd_sync(h, tid, zal_decode_int);
}

int32_t zal_cmd_sync_hash(zal_ipod_handle *h, int tid, zal_hash_reader read) {
    if (h == nullptr) return -1;
    zal_ipod_reply *reply = zal_ipod_wait_for_tid_ex(h, static_cast<uint16_t>(tid));
    int32_t result = zal_decode_hash(h, reply, read);
    reply_record_free(reply);
    return result;
}

int32_t zal_hash_int(const gval *hash, const char *key, int32_t fallback) {
    gval *v = zal_kind(hash) == SERIALIZE_HASH ? serialize_hash_get(hash, key) : nullptr;
    return zal_kind(v) == SERIALIZE_INT ? serialize_get_int(v) : fallback;
}

const char *zal_hash_string(const gval *hash, const char *key) {
    gval *v = zal_kind(hash) == SERIALIZE_HASH ? serialize_hash_get(hash, key) : nullptr;
    return zal_kind(v) == SERIALIZE_STRING ? serialize_get_string(v) : nullptr;
}

bool zal_reply_error(zal_ipod_handle *h, const gval *hash) {
    return zal_kind(hash) == SERIALIZE_HASH && take_error(h, hash);
}

bool zal_flag_set(const gval *hash, const char *key) {
    return zal_hash_int(hash, key, 0) != 0;
}

void zal_copy_text(char *buffer, std::size_t size, const char *text) {
    const std::size_t length = text != nullptr ? strnlen(text, size - 1) : 0;
    if (length > 0) memcpy(buffer, text, length);
    buffer[length] = '\0';
}
