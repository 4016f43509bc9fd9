// iAP1 database browsing: hierarchy, category and record selection, record names, track
// records of the database and the play queue, and the library information, with the
// accessors of the results the handle keeps.
#include <cstdio>
#include <cstring>

#include "common/log.h"
#include "common/value_internal.h"
#include "zal-ipod-2/command.h"
#include "zal-ipod-2/media_db_state.h"
#include "zal-ipod-2/packet.h"
#include "zal-ipod-2/playback_state.h"

zal_records_state::~zal_records_state() {
    serialize_free(records);
    serialize_free(db_track_info);
    serialize_free(pb_track_info);
}

namespace {

int32_t array_int(const gval *array, uint32_t i, int32_t fallback) {
    const gval *v = serialize_array_get(array, i);
    return zal_kind(v) == SERIALIZE_INT ? serialize_get_int(v) : fallback;
}

// Track info decoding shared by the DB and PB results. The reply is kept without a copy:
// only its leading element goes, so a result of thousands of records costs one decode.
// A reply that is neither an error hash nor an array (a lone int, a string) is malformed:
// -1, and the previous result stays.
int32_t decode_track_info(zal_ipod_handle *h, const zal_ipod_reply *reply, gval **result) {
    if (h == nullptr) return -1;
    gval *v = zal_reply_value(reply);
    if (v == nullptr) return -1;
    if (zal_kind(v) != SERIALIZE_ARRAY) {
        if (zal_kind(v) == SERIALIZE_HASH) zal_reply_error(h, v);
        serialize_free(v);
        return -1;
    }
    serialize_array_del(v, 0);  // an empty reply stays an empty result (no tracks)
    serialize_free(*result);
    *result = v;
    return 1;
}

// Copies exactly n bytes of the byte string under key into out. A missing, mistyped or
// short byte string would leave part of the field stale or need invented bytes, so the
// field is left whole as it was and the answer counts as a failure.
bool copy_fixed_bytes(const gval *hash, const char *key, uint8_t *out, uint32_t n) {
    const gval *v = serialize_hash_get(hash, key);
    if (zal_kind(v) != SERIALIZE_BYTES) return false;
    uint32_t length = 0;
    const void *bytes = serialize_get_bytes(v, &length);
    if (length < n) return false;
    memcpy(out, bytes, n);
    return true;
}

int32_t read_itunes_info(zal_ipod_handle *h, const gval *hash) {
    serialize_print(hash);
    zal_records_state &r = h->records;
    const int32_t type = zal_hash_int(hash, "type", -1);
    bool stored = false;
    if (type == 0) {
        stored = copy_fixed_bytes(hash, "uid", r.device_uid, sizeof r.device_uid);
    } else if (type == 1) {
        stored = copy_fixed_bytes(hash, "last_sync", r.last_sync_time, sizeof r.last_sync_time);
    } else {
        const gval *count = serialize_hash_get(hash, "count");
        stored = zal_kind(count) == SERIALIZE_INT;
        if (stored) r.itunes_info_count = serialize_get_int(count);
    }
    if (!stored) {
        ZAL_LOGE("library information of type %d lacks its field\n", type);
        return -1;
    }
    return 1;
}

// Record count kept from a set-category or select reply; -1 when it failed.
int32_t keep_record_count(zal_ipod_handle *h, int32_t result) {
    if (h != nullptr) h->records.record_count = result;
    return result;
}

// Track info layouts: identifiers only when the result is empty or starts with a byte
// string, else full records of kFieldsPerTrack elements.
constexpr uint32_t kFieldsPerTrack = 8;
enum TrackField : uint32_t {
    kCapability = 0,
    kName = 1,
    kArtist = 2,
    kAlbum = 3,
    kGenre = 4,
    kComposer = 5,
    kDuration = 6,
    kUid = 7,
};

// The result's array body, read directly: the accessors run for every field of thousands
// of tracks, so they index the body once instead of going through the checked getters.
const gval_array *items_of(const gval *result) {
    return zal_kind(result) == SERIALIZE_ARRAY ? static_cast<const gval_array *>(result->data)
                                               : nullptr;
}

bool identifier_layout(const gval_array *a) {
    return a->count <= 0 || zal_kind(a->items[0]) == SERIALIZE_BYTES;
}

// Element of field f of track i in a full-layout result, or nullptr when track i is not
// whole in it. The arithmetic is 64-bit so that no index wraps.
const gval *full_field(const gval *result, int i, uint32_t f) {
    const gval_array *a = items_of(result);
    if (i < 0 || a == nullptr || identifier_layout(a)) return nullptr;
    if (static_cast<uint64_t>(i) >= static_cast<uint64_t>(a->count) / kFieldsPerTrack)
        return nullptr;
    return a->items[static_cast<uint64_t>(i) * kFieldsPerTrack + f];
}

int int_field(const gval *result, int i, uint32_t f, int *out) {
    const gval *v = full_field(result, i, f);
    if (zal_kind(v) != SERIALIZE_INT || out == nullptr) return 0;
    *out = serialize_get_int(v);
    return 1;
}

int text_field(const gval *result, int i, uint32_t f, const char **out) {
    const gval *v = full_field(result, i, f);
    if (zal_kind(v) != SERIALIZE_STRING || out == nullptr) return 0;
    *out = serialize_get_string(v);
    return 1;
}

}  // namespace

int32_t zal_records_decode(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    if (h == nullptr || reply == nullptr || reply->length == 0 || reply->payload == nullptr)
        return -1;
    gval *v = zal_reply_value(reply);
    if (zal_kind(v) != SERIALIZE_ARRAY) {
        serialize_free(v);
        return 1;
    }
    serialize_free(h->records.records);
    h->records.records = v;
    // Without a validity flag the cache holds nothing usable (zal_ipod_record answers "").
    return array_int(v, 1, 0);
}

int32_t zal_itunes_info_decode(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    if (h == nullptr) return -1;
    return zal_decode_hash(h, reply, read_itunes_info);
}

int32_t zal_db_track_info_decode(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    return h != nullptr ? decode_track_info(h, reply, &h->records.db_track_info) : -1;
}

int32_t zal_pb_track_info_decode(zal_ipod_handle *h, const zal_ipod_reply *reply) {
    return h != nullptr ? decode_track_info(h, reply, &h->records.pb_track_info) : -1;
}

extern "C" {

ZAL_API int zal_ipod_set_hierarchy(zal_ipod_handle *h, int hierarchy) {
    int tid = zal_cmd_send(h, ZAL_OP_SET_HIERARCHY, zal_arg_int(hierarchy), __func__);
    if (tid != 0) h->records.hierarchy = hierarchy;
    return tid;
}
ZAL_API int zal_ipod_set_hierarchy_sync(zal_ipod_handle *h, int hierarchy) {
    return zal_cmd_sync_int(h, zal_ipod_set_hierarchy(h, hierarchy));
}

ZAL_API int zal_ipod_set_category(zal_ipod_handle *h, int category) {
    int tid = zal_cmd_send(h, ZAL_OP_SET_CATEGORY, zal_arg_int(category), __func__,
                           &zal_pending_slots::category_tid);
    if (tid != 0) h->records.current_category = category;
    return tid;
}
ZAL_API int zal_ipod_set_category_sync(zal_ipod_handle *h, int category) {
    if (h == nullptr) return -1;
    h->records.current_category = category;
    return keep_record_count(h, zal_cmd_sync_int(h, zal_ipod_set_category(h, category)));
}

ZAL_API int zal_ipod_select_db(zal_ipod_handle *h, int record, int category) {
    return zal_cmd_send(h, ZAL_OP_SELECT_DB, zal_arg_ints({record, category}), __func__,
                        &zal_pending_slots::select_db_tid);
}
ZAL_API int zal_ipod_select_db_sync(zal_ipod_handle *h, int record, int category) {
    if (h == nullptr) return -1;
    return keep_record_count(h, zal_cmd_sync_int(h, zal_ipod_select_db(h, record, category)));
}

ZAL_API int zal_ipod_get_records(zal_ipod_handle *h, int offset, int count) {
    return zal_cmd_send(h, ZAL_OP_GET_DB_RECORDS, zal_arg_ints({offset, count}), __func__,
                        &zal_pending_slots::records_tid);
}
ZAL_API int zal_ipod_get_records_sync(zal_ipod_handle *h, int offset, int count) {
    return zal_cmd_sync(h, zal_ipod_get_records(h, offset, count), zal_records_decode);
}

ZAL_API int zal_ipod_indexed_track_info(zal_ipod_handle *h, int index) {
    return zal_cmd_send(h, ZAL_OP_INDEXED_TRACK_INFO, zal_arg_int(index), __func__,
                        &zal_pending_slots::indexed_track_info_tid);
}
ZAL_API int zal_ipod_indexed_track_info_sync(zal_ipod_handle *h, int index) {
    return zal_cmd_sync(h, zal_ipod_indexed_track_info(h, index), zal_decode_indexed_track_info);
}

ZAL_API int zal_ipod_get_db_itunes_info(zal_ipod_handle *h, int type) {
    return zal_cmd_send(h, ZAL_OP_GET_DB_ITUNES_INFO, zal_arg_int(type), __func__,
                        &zal_pending_slots::itunes_info_tid);
}
ZAL_API int zal_ipod_get_db_itunes_info_sync(zal_ipod_handle *h, int type) {
    return zal_cmd_sync(h, zal_ipod_get_db_itunes_info(h, type), zal_itunes_info_decode);
}

ZAL_API int zal_ipod_get_db_track_info(zal_ipod_handle *h, int offset, int count,
                                       int identifiers_only) {
    return zal_cmd_send(h, ZAL_OP_GET_DB_TRACK_INFO,
                        zal_arg_ints({offset, count, identifiers_only}), __func__,
                        &zal_pending_slots::db_track_info_tid);
}
ZAL_API int zal_ipod_get_db_track_info_sync(zal_ipod_handle *h, int offset, int count,
                                            int identifiers_only) {
    return zal_cmd_sync(h, zal_ipod_get_db_track_info(h, offset, count, identifiers_only),
                        zal_db_track_info_decode);
}

ZAL_API int zal_ipod_get_pb_track_info(zal_ipod_handle *h, int offset, int count,
                                       int identifiers_only) {
    return zal_cmd_send(h, ZAL_OP_GET_PB_TRACK_INFO,
                        zal_arg_ints({offset, count, identifiers_only}), __func__,
                        &zal_pending_slots::pb_track_info_tid);
}
ZAL_API int zal_ipod_get_pb_track_info_sync(zal_ipod_handle *h, int offset, int count,
                                            int identifiers_only) {
    return zal_cmd_sync(h, zal_ipod_get_pb_track_info(h, offset, count, identifiers_only),
                        zal_pb_track_info_decode);
}

ZAL_API int zal_ipod_get_category(zal_ipod_handle *h) {
    return h != nullptr ? h->records.current_category : -1;
}

ZAL_API int zal_ipod_record_count(zal_ipod_handle *h) {
    return h != nullptr ? h->records.record_count : -1;
}

// The cache's own count is not trusted: an index is answered only when the array really
// holds a string there, whatever offset and count claim.
ZAL_API const char *zal_ipod_record(zal_ipod_handle *h, int index) {
    if (h == nullptr) return "";
    // Read for every name of a page: straight from the array's body.
    const gval *cache = h->records.records;
    if (zal_kind(cache) != SERIALIZE_ARRAY) return "";
    const gval_array *body = value_array_body(cache);
    if (body->count < 4) return "";
    auto header = [body](int32_t i) {
        const gval *v = body->items[i];
        int32_t x = 0;
        if (v != nullptr && v->type == SERIALIZE_INT) std::memcpy(&x, v->data, sizeof x);
        return x;
    };
    if (header(1) == 0) return "";
    const int64_t offset = header(2);
    const int64_t count = header(3);
    if (index < offset) {
        printf("Err: offset[%d]<_offset[%d]\n", index, static_cast<int>(offset));
        return "";
    }
    if (index >= offset + count) {
        printf("Err: offset[%d] >= (_offset[%d]+_count[%d]): \n", index, static_cast<int>(offset),
               static_cast<int>(count));
        return "";
    }
    const int64_t element = index - offset + 4;
    if (element >= body->count) return "";
    const gval *name = body->items[element];
    return name != nullptr && name->type == SERIALIZE_STRING ? static_cast<const char *>(name->data)
                                                             : "";
}

ZAL_API const gval *zal_ipod_get_result_db_track_info(zal_ipod_handle *h) {
    return h != nullptr ? h->records.db_track_info : nullptr;
}
ZAL_API const gval *zal_ipod_get_result_pb_track_info(zal_ipod_handle *h) {
    return h != nullptr ? h->records.pb_track_info : nullptr;
}
ZAL_API const uint8_t *zal_ipod_get_result_db_device_uid(zal_ipod_handle *h) {
    return h != nullptr ? h->records.device_uid : nullptr;
}
ZAL_API const uint8_t *zal_ipod_get_result_db_last_sync_time(zal_ipod_handle *h) {
    return h != nullptr ? h->records.last_sync_time : nullptr;
}
ZAL_API int zal_ipod_get_result_db_itunes_info_count(zal_ipod_handle *h) {
    return h != nullptr ? h->records.itunes_info_count : -1;
}

ZAL_API int zal_ipod_get_result_db_track_info_count(const gval *result) {
    const gval_array *a = items_of(result);
    if (a == nullptr || a->count <= 0) return 0;
    return identifier_layout(a) ? a->count : a->count / static_cast<int32_t>(kFieldsPerTrack);
}

ZAL_API int zal_ipod_get_result_db_track_info_capability(const gval *result, int i, int *out) {
    return int_field(result, i, kCapability, out);
}
ZAL_API int zal_ipod_get_result_db_track_info_name(const gval *result, int i, const char **out) {
    return text_field(result, i, kName, out);
}
ZAL_API int zal_ipod_get_result_db_track_info_artist(const gval *result, int i, const char **out) {
    return text_field(result, i, kArtist, out);
}
ZAL_API int zal_ipod_get_result_db_track_info_album(const gval *result, int i, const char **out) {
    return text_field(result, i, kAlbum, out);
}
ZAL_API int zal_ipod_get_result_db_track_info_genre(const gval *result, int i, const char **out) {
    return text_field(result, i, kGenre, out);
}
ZAL_API int zal_ipod_get_result_db_track_info_composer(const gval *result, int i,
                                                       const char **out) {
    return text_field(result, i, kComposer, out);
}
ZAL_API int zal_ipod_get_result_db_track_info_duration(const gval *result, int i, int *out) {
    return int_field(result, i, kDuration, out);
}

ZAL_API int zal_ipod_get_result_db_track_info_uid(const gval *result, int i, const uint8_t **out) {
    if (i < 0 || zal_kind(result) != SERIALIZE_ARRAY || out == nullptr) return 0;
    const gval_array *a = items_of(result);
    if (a == nullptr) return 0;
    const gval *v = !identifier_layout(a) ? full_field(result, i, kUid)
                    : i < a->count        ? a->items[i]
                                          : nullptr;
    if (zal_kind(v) != SERIALIZE_BYTES) return 0;
    uint32_t length = 0;
    *out = static_cast<const uint8_t *>(serialize_get_bytes(v, &length));
    return length == 8 ? 1 : 0;
}

}  // extern "C"
