// Device information queries: lingo versions and options, localization, equaliser
// profiles, battery, sound check, Bluetooth status, Wi-Fi information, power source and
// re-authentication. Most answers are flagged hashes (a success flag named like the
// request beside the data); the lingo version and the localization texts are kept in the
// handle, the other answers go to the caller.
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "common/log.h"
#include "zal-ipod-2/command_forms.h"
#include "zal-ipod-2/device_decoders.h"

namespace {

constexpr char kLingoTrace[] = "set_lingo_version";
// Bytes of the lingo options: a 64-bit mask, most significant byte first.
constexpr uint32_t kLingoOptionsSize = 8;

int32_t store_lingo_version(zal_ipod_handle *h, const gval *hash) {
    if (!zal_flag_set(hash, "request_lingo_version")) {
        puts("Requesting lingo version failed!");
        return -1;
    }
    const int32_t major = zal_hash_int(hash, "major", 0);
    const int32_t minor = zal_hash_int(hash, "minor", 0);
    fprintf(stderr, "%s, major=%d, minor=%d\n", kLingoTrace, major, minor);
    zal_device_info_state &info = h->device_info;
    info.lingo_major = major;
    info.lingo_minor = minor;
    // A version whose text does not fit (100.100, negative numbers) leaves the text empty
    // rather than showing a cut, wrong number; the numbers themselves are kept.
    char text[32];
    const int length = snprintf(text, sizeof text, "%d.%d", major, minor);
    memset(info.lingo_version, 0, sizeof info.lingo_version);
    if (length > 0 && static_cast<std::size_t>(length) < sizeof info.lingo_version)
        memcpy(info.lingo_version, text, static_cast<std::size_t>(length));
    return 1;
}

// Only types 0 and 1 have a place; a reply for another type, or without a text, is not
// stored. A text longer than 63 characters is cut.
int32_t store_localization(zal_ipod_handle *h, const gval *hash) {
    const int32_t type = zal_hash_int(hash, "type", -1);
    const char *data = zal_hash_string(hash, "data");
    if (type < 0 || type >= kLocalizationTypes || data == nullptr) return -1;
    zal_copy_text(h->device_info.localization[type], kLocalizationTextSize, data);
    return 1;
}

// A reply shorter than 8 bytes carries no complete mask: 0, as for no reply.
uint64_t decode_lingo_options(zal_ipod_handle *, const zal_ipod_reply *reply) {
    gval *v = zal_reply_value(reply);
    uint32_t length = 0;
    const void *bytes = zal_kind(v) == SERIALIZE_BYTES ? serialize_get_bytes(v, &length) : nullptr;
    uint64_t options = 0;
    if (bytes != nullptr && length >= kLingoOptionsSize) {
        const auto *b = static_cast<const unsigned char *>(bytes);
        for (uint32_t i = 0; i < kLingoOptionsSize; ++i) options = (options << 8) | b[i];
    }
    serialize_free(v);
    return options;
}

// The caller's 64-byte buffer gets exactly 64 bytes: the name, then NULs. A name of 64
// characters or more fills the buffer without a terminator, as the interface documents;
// the name is never read past its own end. A flagged reply without a name text fails.
int32_t decode_eq_name(zal_ipod_handle *h, const zal_ipod_reply *reply, char *name) {
    return zal_decode_flagged(h, reply, "get_indexed_eqprofile_name",
                              [name](zal_ipod_handle *, const gval *hash) -> int32_t {
                                  const char *text = zal_hash_string(hash, "name");
                                  if (text == nullptr) return -1;
                                  if (name == nullptr) return 1;
                                  const std::size_t n = strnlen(text, ZAL_EQPROFILE_NAME_SIZE);
                                  memcpy(name, text, n);
                                  memset(name + n, 0, ZAL_EQPROFILE_NAME_SIZE - n);
                                  return 1;
                              });
}

// Both numbers must be there; otherwise neither output is touched.
int32_t decode_battery(zal_ipod_handle *h, const zal_ipod_reply *reply, int *state, int *level) {
    return zal_decode_flagged(h, reply, "get_power_battery_state",
                              [state, level](zal_ipod_handle *, const gval *hash) -> int32_t {
                                  gval *s = serialize_hash_get(hash, "state");
                                  gval *l = serialize_hash_get(hash, "level");
                                  if (zal_kind(s) != SERIALIZE_INT || zal_kind(l) != SERIALIZE_INT)
                                      return -1;
                                  if (state != nullptr) *state = serialize_get_int(s);
                                  if (level != nullptr) *level = serialize_get_int(l);
                                  return 1;
                              });
}

char *decode_bt_status(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    gval *hash = zal_reply_hash(h, reply);
    const char *status = zal_hash_string(hash, "current_bt_status");
    char *copy = status != nullptr ? strdup(status) : nullptr;
    if (status != nullptr && copy == nullptr) ZAL_LOGE("%s: out of memory\n", __func__);
    serialize_free(hash);
    return copy;
}

int32_t decode_eq_index(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    return zal_decode_flagged_int(h, reply, "get_current_eqprofile_index", "index");
}
int32_t decode_eq_count(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    return zal_decode_flagged_int(h, reply, "get_num_eqprofiles", "number");
}
int32_t decode_sound_check(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    return zal_decode_flagged_int(h, reply, "get_sound_check_state", "state");
}
int32_t always_zero(zal_ipod_handle *, const zal_ipod_reply *) {
    return 0;
}

}  // namespace

int32_t zal_lingo_version_decode(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    fprintf(stderr, "%s\n", kLingoTrace);
    return zal_decode_hash_with(h, reply, store_lingo_version);
}

int32_t zal_localization_decode(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    return zal_decode_hash_with(h, reply, store_localization);
}

extern "C" {

ZAL_API int zal_ipod_request_lingo_version(zal_ipod_handle *h, int lingo) {
    fprintf(stderr, "%s, lingo=0x%02X\n", __func__, static_cast<unsigned>(lingo));
    return zal_cmd_send(h, ZAL_OP_REQUEST_LINGO_VERSION, zal_arg_int(lingo), __func__,
                        &zal_pending_slots::lingo_version_tid);
}
ZAL_API int zal_ipod_request_lingo_version_sync(zal_ipod_handle *h, int lingo) {
    return zal_cmd_sync(h, zal_ipod_request_lingo_version(h, lingo), zal_lingo_version_decode);
}

ZAL_API int zal_ipod_get_lingo_options(zal_ipod_handle *h, int lingo) {
    return zal_cmd_send(h, ZAL_OP_LINGO_OPTIONS, zal_arg_int(lingo), __func__);
}
ZAL_API uint64_t zal_ipod_get_lingo_options_sync(zal_ipod_handle *h, int lingo) {
    return zal_cmd_sync_with(h, zal_ipod_get_lingo_options(h, lingo), decode_lingo_options);
}

ZAL_API int zal_ipod_localization_info(zal_ipod_handle *h, int type) {
    return zal_cmd_send(h, ZAL_OP_LOCALIZATION_INFO, zal_arg_int(type), __func__,
                        &zal_pending_slots::localization_tid);
}
ZAL_API int zal_ipod_localization_info_sync(zal_ipod_handle *h, int type) {
    return zal_cmd_sync(h, zal_ipod_localization_info(h, type), zal_localization_decode);
}

ZAL_API int zal_ipod_get_current_eqprofile_index(zal_ipod_handle *h) {
    return zal_cmd_send(h, ZAL_OP_GET_CURRENT_EQPROFILE_INDEX);
}
ZAL_API int zal_ipod_get_current_eqprofile_index_sync(zal_ipod_handle *h) {
    return zal_cmd_sync(h, zal_ipod_get_current_eqprofile_index(h), decode_eq_index);
}

ZAL_API int zal_ipod_set_current_eqprofile_index(zal_ipod_handle *h, int index, int value) {
    return zal_cmd_send(h, ZAL_OP_SET_CURRENT_EQPROFILE_INDEX, zal_arg_ints({index, value}),
                        __func__);
}
ZAL_API int zal_ipod_set_current_eqprofile_index_sync(zal_ipod_handle *h, int index, int value) {
    return zal_cmd_sync_int(h, zal_ipod_set_current_eqprofile_index(h, index, value));
}

ZAL_API int zal_ipod_get_num_eqprofiles(zal_ipod_handle *h) {
    return zal_cmd_send(h, ZAL_OP_GET_NUM_EQPROFILES);
}
ZAL_API int zal_ipod_get_num_eqprofiles_sync(zal_ipod_handle *h) {
    return zal_cmd_sync(h, zal_ipod_get_num_eqprofiles(h), decode_eq_count);
}

ZAL_API int zal_ipod_get_indexed_eqprofile_name(zal_ipod_handle *h, int index) {
    return zal_cmd_send(h, ZAL_OP_GET_INDEXED_EQPROFILE_NAME, zal_arg_int(index), __func__);
}
ZAL_API int zal_ipod_get_indexed_eqprofile_name_sync(zal_ipod_handle *h, int index, char *name) {
    return zal_cmd_sync_with(h, zal_ipod_get_indexed_eqprofile_name(h, index),
                             [name](auto *hh, auto *r) { return decode_eq_name(hh, r, name); });
}

ZAL_API int zal_ipod_get_power_battery_state(zal_ipod_handle *h) {
    return zal_cmd_send(h, ZAL_OP_GET_POWER_BATTERY_STATE);
}
ZAL_API int zal_ipod_get_power_battery_state_sync(zal_ipod_handle *h, int *state, int *level) {
    return zal_cmd_sync_with(h, zal_ipod_get_power_battery_state(h), [=](auto *hh, auto *r) {
        return decode_battery(hh, r, state, level);
    });
}

ZAL_API int zal_ipod_get_sound_check_state(zal_ipod_handle *h) {
    return zal_cmd_send(h, ZAL_OP_GET_SOUND_CHECK_STATE);
}
ZAL_API int zal_ipod_get_sound_check_state_sync(zal_ipod_handle *h) {
    return zal_cmd_sync(h, zal_ipod_get_sound_check_state(h), decode_sound_check);
}

ZAL_API int zal_ipod_set_sound_check_state(zal_ipod_handle *h, int state, int value) {
    return zal_cmd_send(h, ZAL_OP_SET_SOUND_CHECK_STATE, zal_arg_ints({state, value}), __func__);
}
ZAL_API int zal_ipod_set_sound_check_state_sync(zal_ipod_handle *h, int state, int value) {
    return zal_cmd_sync_int(h, zal_ipod_set_sound_check_state(h, state, value));
}

ZAL_API int zal_ipod_bt_connection_status(zal_ipod_handle *h) {
    return zal_cmd_send(h, ZAL_OP_GET_BT_CONNECTION_STATUS);
}
ZAL_API char *zal_ipod_bt_connection_status_sync(zal_ipod_handle *h) {
    return zal_cmd_sync_with(h, zal_ipod_bt_connection_status(h), decode_bt_status);
}

ZAL_COMMAND_NO_ARG(request_wifi_connection_info, ZAL_OP_REQUEST_WIFI_CONNECTION_INFO)
ZAL_COMMAND_INT_ARG(reauthentication, ZAL_OP_REAUTHENTICATION)

ZAL_API int zal_ipod_device_power_source_update(zal_ipod_handle *h, int a, int b) {
    return zal_cmd_send(h, ZAL_OP_POWER_SOURCE_UPDATE, zal_arg_ints({a, b}), __func__);
}
ZAL_API int zal_ipod_device_power_source_update_sync(zal_ipod_handle *h, int a, int b) {
    return zal_cmd_sync(h, zal_ipod_device_power_source_update(h, a, b), always_zero);
}

ZAL_API int zal_ipod_get_result_lingo_version_major(zal_ipod_handle *h) {
    return h != nullptr ? h->device_info.lingo_major : -1;
}
ZAL_API int zal_ipod_get_result_lingo_version_minor(zal_ipod_handle *h) {
    return h != nullptr ? h->device_info.lingo_minor : -1;
}
ZAL_API const char *zal_ipod_get_result_lingo_version(zal_ipod_handle *h) {
    return h != nullptr ? h->device_info.lingo_version : nullptr;
}
ZAL_API const char *zal_ipod_current_localization_info(zal_ipod_handle *h, int type) {
    if (h == nullptr || type < 0 || type >= kLocalizationTypes) return nullptr;
    return h->device_info.localization[type];
}

}  // extern "C"
