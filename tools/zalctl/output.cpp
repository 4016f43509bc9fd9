// Output helpers shared by the command families: JSON and text renderings of value trees,
// event kind names, times and the progress bar.
#include <cstdio>

#include "zalctl.h"

namespace zalctl {

namespace {

// Values come from the daemon: keep the renderings bounded even for a deep tree.
constexpr int kMaxDepth = 32;

// Indexed by ZALIPOD_EVENT_* kind; entry 0 is no kind.
constexpr const char *kEventKindNames[] = {
    "unknown",
    "connected",
    "disconnected",
    "detection_failed",
    "authenticated",
    "mode_changed",
    "playstate_changed",
    "track_changed",
    "trackinfo_retrieved",
    "samplerate_retrieved",
    "track_position_changed",
    "chapter_changed",
    "initstate",
    "iap2_inuse",
    "medialibraryupdate",
    "media_changed",
    "artwork_transfer_done",
    "bt_connection_update",
    "eap_datagram",
    "location_information",
    "playing_app",
    "telephony_callstate_information",
    "vehicle_status_update",
    "wifi_information",
    "telephony_update",
    "track_is_audiobook",
    "shuffle_mode_changed",
    "repeat_mode_changed",
    "disconnected_hostmode",
    "role_switched",
    "telephony_vcard_information",
    "device_name",
    "wireless_carplay_update",
    "unknown",
};
static_assert(sizeof(kEventKindNames) / sizeof(kEventKindNames[0]) == ZALIPOD_EVENT_UNKNOWN + 1);

std::string hex_of(const void *data, uint32_t length) {
    static const char digits[] = "0123456789abcdef";
    const auto *bytes = static_cast<const unsigned char *>(data);
    std::string out;
    out.reserve(length * 2u);
    for (uint32_t i = 0; i < length; ++i) {
        out += digits[bytes[i] >> 4];
        out += digits[bytes[i] & 15];
    }
    return out;
}

Json json_at(const gval *v, int depth) {
    if (depth > kMaxDepth) return "...";
    switch (serialize_type(v)) {
        case SERIALIZE_INT:
            return serialize_get_int(v);
        case SERIALIZE_FLOAT:
            return serialize_get_float(v);
        case SERIALIZE_STRING:
            // Invalid UTF-8 is replaced when the document is printed.
            return std::string(serialize_get_string(v));
        case SERIALIZE_BYTES: {
            uint32_t length = 0;
            const void *data = serialize_get_bytes(v, &length);
            return hex_of(data, length);
        }
        case SERIALIZE_STRUCT:
            return hex_of(serialize_get_struct(v), serialize_get_struct_length(v));
        case SERIALIZE_ARRAY: {
            Json out = Json::array();
            const int count = serialize_array_count(v);
            for (int i = 0; i < count; ++i)
                out.push_back(json_at(serialize_array_get(v, static_cast<uint32_t>(i)), depth + 1));
            return out;
        }
        case SERIALIZE_HASH: {
            Json out = Json::object();
            const int count = serialize_hash_count(v);
            for (int i = 0; i < count; ++i) {
                const char *key = serialize_hash_get_key(v, i);
                if (key != nullptr) out[key] = json_at(serialize_hash_get(v, key), depth + 1);
            }
            return out;
        }
        default:
            return nullptr;
    }
}

std::string text_at(const gval *v, int depth, bool top) {
    if (depth > kMaxDepth) return "...";
    switch (serialize_type(v)) {
        case SERIALIZE_STRING:
            return Json(serialize_get_string(v))
                .dump(-1, ' ', false, Json::error_handler_t::replace);
        case SERIALIZE_ARRAY: {
            std::string out = "[";
            const int count = serialize_array_count(v);
            for (int i = 0; i < count; ++i) {
                if (i > 0) out += ", ";
                out += text_at(serialize_array_get(v, static_cast<uint32_t>(i)), depth + 1, false);
            }
            return out + "]";
        }
        case SERIALIZE_HASH: {
            std::string out = top ? "" : "{";
            const int count = serialize_hash_count(v);
            for (int i = 0; i < count; ++i) {
                const char *key = serialize_hash_get_key(v, i);
                if (key == nullptr) continue;
                if (i > 0) out += " ";
                out += key;
                out += "=";
                out += text_at(serialize_hash_get(v, key), depth + 1, false);
            }
            return top ? out : out + "}";
        }
        default:
            return json_at(v, depth).dump(-1, ' ', false, Json::error_handler_t::replace);
    }
}

}  // namespace

void print_json(const Json &doc) {
    const std::string text = doc.dump(-1, ' ', false, Json::error_handler_t::replace);
    fprintf(stdout, "%s\n", text.c_str());
    fflush(stdout);
}

Json to_json(const gval *value) {
    return json_at(value, 0);
}

std::string to_text(const gval *value) {
    return text_at(value, 0, true);
}

const char *event_kind_name(int kind) {
    if (kind < 0 || kind > ZALIPOD_EVENT_UNKNOWN) return "unknown";
    return kEventKindNames[kind];
}

std::string format_time(int32_t ms) {
    if (ms < 0) return "-:--";
    const int32_t seconds = ms / 1000;
    char text[32];
    snprintf(text, sizeof text, "%d:%02d", static_cast<int>(seconds / 60),
             static_cast<int>(seconds % 60));
    return text;
}

std::string progress_bar(int32_t position_ms, int32_t length_ms, int width) {
    int filled = 0;
    if (length_ms > 0 && position_ms > 0) {
        const int64_t cells = static_cast<int64_t>(position_ms) * width / length_ms;
        filled = static_cast<int>(cells > width ? width : cells);
    }
    return "[" + std::string(static_cast<size_t>(filled), '#') +
           std::string(static_cast<size_t>(width - filled), '.') + "]";
}

}  // namespace zalctl
