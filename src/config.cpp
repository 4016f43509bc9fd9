// Runtime configuration from a client: SET_CONFIG and GET_CONFIG. They are sent on any
// connected handle, before a session is open (the configuration is the daemon's, not a
// device's), and their synchronous forms decode the reply with config_reply.h.
#include <cstdint>

#include "config_reply.h"
#include "zal-ipod-2/command.h"
#include "zal-ipod-2/packet.h"
#include "zal-ipod-2/zal-ipod-2.h"

namespace {

// Waits for tid and decodes the reply's payload; null without a reply or a payload. The
// record is released here.
gval *wait_for_payload(zal_ipod_handle *h, int tid) {
    if (tid <= 0) return nullptr;  // nothing was sent
    zal_ipod_reply *reply = zal_ipod_wait_for_tid_ex(h, static_cast<uint16_t>(tid));
    gval *decoded = nullptr;
    if (reply != nullptr && reply->payload != nullptr && reply->length > 0)
        decoded = unserialize(reply->payload, reply->length);
    reply_record_free(reply);
    return decoded;
}

}  // namespace

extern "C" {

ZAL_API uint16_t zal_ipod_set_config(zal_ipod_handle *h, const char *key, const char *value) {
    return static_cast<uint16_t>(zal_cmd_send(
        h, ZAL_OP_SET_CONFIG, zal_arg_array({zal_arg_string(key), zal_arg_string(value)}), __func__,
        nullptr, false));
}

ZAL_API int zal_ipod_set_config_sync(zal_ipod_handle *h, const char *key, const char *value) {
    if (h == nullptr) return zal::config::kNoSetReply;
    gval *reply = wait_for_payload(h, zal_ipod_set_config(h, key, value));
    int result = zal::config::set_reply_result(reply, key, value);
    serialize_free(reply);
    return result;
}

ZAL_API uint16_t zal_ipod_get_config(zal_ipod_handle *h, const char *key) {
    return static_cast<uint16_t>(zal_cmd_send(
        h, ZAL_OP_GET_CONFIG, zal_arg_array({zal_arg_string(key)}), __func__, nullptr, false));
}

ZAL_API int zal_ipod_get_config_sync(zal_ipod_handle *h, const char *key, char *out) {
    if (h == nullptr) return zal::config::kNoConfigValue;
    gval *reply = wait_for_payload(h, zal_ipod_get_config(h, key));
    int result = zal::config::get_reply_result(reply, out);
    serialize_free(reply);
    return result;
}

}  // extern "C"
