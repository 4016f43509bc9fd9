// The set_context_ setters that take text: EAP names, team ID, protocol mode, engine type,
// the daemon's paths and Wi-Fi credentials; and the release of what the context owns.
#include <cstdlib>
#include <cstring>

#include "common/daemon/context_internal.h"
#include "common/log.h"
#include "zal-ipod-2/daemon.h"

namespace {

constexpr std::size_t kTeamIdLength = 10;

void free_eap_list(context *ctx) {
    eap_node *node = ctx->eap;
    while (node != nullptr) {
        eap_node *next = node->next;
        std::free(node->name);
        std::free(node);
        node = next;
    }
    ctx->eap = nullptr;
}

// Appends a node at *tail; name may be null. False when out of memory.
bool append_eap(eap_node **&tail, const char *name) {
    auto *node = static_cast<eap_node *>(std::calloc(1, sizeof(eap_node)));
    if (node == nullptr) return false;
    if (name != nullptr && (node->name = strdup(name)) == nullptr) {
        std::free(node);
        return false;
    }
    *tail = node;
    tail = &node->next;
    return true;
}

// Whole copy or nothing: a cut path or passphrase would only fail later, far from here.
// The text itself is not logged (it may be a passphrase).
void store_text(char *field, const char *text, const char *field_name, const char *function,
                int line) {
    if (text == nullptr) {
        zal_log_error_at(function, line, "%s: no text for %s\n", function, field_name);
        return;
    }
    std::size_t n = std::strlen(text);
    if (n >= ZAL_CONTEXT_TEXT_SIZE) {
        zal_log_error_at(function, line, "%s: %zu characters do not fit %s (at most %d)\n",
                         function, n, field_name, ZAL_CONTEXT_TEXT_SIZE - 1);
        return;
    }
    std::memcpy(field, text, n + 1);
}

}  // namespace

extern "C" {

ZAL_API int set_context_eap(context *ctx, char *list) {
    if (ctx == nullptr) return 1;
    free_eap_list(ctx);
    if (list == nullptr) return 1;

    eap_node **tail = &ctx->eap;
    bool ok = true;
    if (list[0] == ',') ok = append_eap(tail, nullptr);
    char *save = nullptr;
    for (char *piece = strtok_r(list, ",", &save); ok && piece != nullptr;
         piece = strtok_r(nullptr, ",", &save))
        ok = append_eap(tail, piece);
    // The names taken so far stay; the daemon runs with a shorter list rather than none.
    if (!ok) ZAL_LOGE("%s: out of memory\n", __func__);
    return 1;
}

ZAL_API int set_context_app_match_team_id(context *ctx, const char *id) {
    if (ctx == nullptr) return 0;
    std::free(ctx->app_match_team_id);
    ctx->app_match_team_id = nullptr;
    if (id == nullptr || id[0] == '\0') return 1;
    if (std::strlen(id) != kTeamIdLength) {
        ZAL_LOGE("app_match_team_id most have exactly 10 characters\n");
        return 0;
    }
    ctx->app_match_team_id = strdup(id);
    if (ctx->app_match_team_id == nullptr) {
        ZAL_LOGE("%s: out of memory\n", __func__);
        return 0;
    }
    return 1;
}

ZAL_API int set_context_highest_protocol_mode(context *ctx, const char *text) {
    if (ctx == nullptr || text == nullptr || text[0] == '\0') return 0;
    int32_t mode = zal::daemon::parse_decimal(text);
    ctx->highest_protocol_mode = mode < 1 ? 1 : mode;
    return 1;
}

ZAL_API void set_context_vehicle_information_component_engine_type(context *ctx, const char *text) {
    if (ctx == nullptr || text == nullptr || text[0] == '\0') return;
    ctx->vehicle_information_component_engine_type = zal::daemon::parse_decimal(text);
}

ZAL_API void set_context_media_library_db_path(context *ctx, const char *text) {
    if (ctx)
        store_text(ctx->media_library_db_path, text, "media_library_db_path", __func__, __LINE__);
}
ZAL_API void set_context_artwork_path(context *ctx, const char *text) {
    if (ctx) store_text(ctx->artwork_path, text, "artwork_path", __func__, __LINE__);
}
ZAL_API void set_context_vehicle_information_component_name(context *ctx, const char *text) {
    if (ctx)
        store_text(ctx->vehicle_information_component_name, text,
                   "vehicle_information_component_name", __func__, __LINE__);
}
ZAL_API void set_context_vehicle_information_component_displayName(context *ctx, const char *text) {
    if (ctx)
        store_text(ctx->vehicle_information_component_displayName, text,
                   "vehicle_information_component_displayName", __func__, __LINE__);
}
ZAL_API void set_context_accessory_wifi_ssid(context *ctx, const char *text) {
    if (ctx) store_text(ctx->accessory_wifi_ssid, text, "accessory_wifi_ssid", __func__, __LINE__);
}
ZAL_API void set_context_accessory_wifi_passphrase(context *ctx, const char *text) {
    if (ctx)
        store_text(ctx->accessory_wifi_passphrase, text, "accessory_wifi_passphrase", __func__,
                   __LINE__);
}

ZAL_API int set_context_cp_server(void) {
    return 1;
}

ZAL_API void zal_context_release(context *ctx) {
    if (ctx == nullptr) return;
    free_eap_list(ctx);
    std::free(ctx->app_match_team_id);
    ctx->app_match_team_id = nullptr;
}

}  // extern "C"
