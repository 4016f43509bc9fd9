// Decoding of the runtime configuration replies and the reports of refused writes.
#include "config_reply.h"

#include <cstring>

#include "common/log.h"

namespace zal::config {
namespace {

// The reports belong to the exported function that waits for the reply.
constexpr const char *kReporter = "zal_ipod_set_config_sync";

struct ConfigRefusal {
    int32_t outcome;
    const char *format;  // takes key, then value
};

constexpr ConfigRefusal kConfigRefusals[] = {
    {0, "config could not be updated for key '%s' and value '%s'!\n"},
    {-1, "the config does not support key '%s'!\n"},
    {-10, "Error: key '%s' is read-only!\n"},
};
constexpr const char *kContextRefusal =
    "the context could not be updated for key '%s' and value '%s'!\n";

// Integer under key; false when absent or of another kind.
bool read_int(const gval *hash, const char *key, int32_t *out) {
    const gval *v = serialize_hash_get(hash, key);
    if (v == nullptr || serialize_type(v) != SERIALIZE_INT) return false;
    *out = serialize_get_int(v);
    return true;
}

bool is_hash(const gval *v) {
    return v != nullptr && serialize_type(v) == SERIALIZE_HASH;
}

}  // namespace

int32_t set_reply_result(const gval *reply, const char *key, const char *value) {
    if (!is_hash(reply)) return kNoSetReply;
    const char *shown_key = key ? key : "";
    const char *shown_value = value ? value : "";
    int32_t cfg = 0, ctx = 0;
    bool has_cfg = read_int(reply, kUpdatedConfigKey, &cfg);
    bool has_ctx = read_int(reply, kUpdatedContextKey, &ctx);
    if (has_cfg) {
        for (const ConfigRefusal &refusal : kConfigRefusals)
            if (refusal.outcome == cfg)
                zal_log_error_at(kReporter, __LINE__, refusal.format, shown_key, shown_value);
    }
    if (has_ctx && ctx == 0)
        zal_log_error_at(kReporter, __LINE__, kContextRefusal, shown_key, shown_value);
    return (has_cfg && cfg == 1) || (has_ctx && ctx == 1) ? 1 : 0;
}

int32_t get_reply_result(const gval *reply, char *out) {
    if (!is_hash(reply)) return kNoConfigValue;
    const gval *v = serialize_hash_get(reply, kValueKey);
    if (v != nullptr && serialize_type(v) == SERIALIZE_STRING) {
        if (out == nullptr) return kNoConfigValue;
        const char *text = serialize_get_string(v);
        // The caller's room is fixed by the API; a longer value from a confused or hostile
        // daemon is refused whole rather than cut (a cut path or key would look valid).
        const std::size_t size = std::strlen(text) + 1;
        if (size > ZAL_IPOD_CONFIG_VALUE_SIZE) {
            ZAL_LOGE("config value of %zu bytes refused (room: %d)\n", size,
                     ZAL_IPOD_CONFIG_VALUE_SIZE);
            return kNoConfigValue;
        }
        std::memcpy(out, text, size);
        return 1;
    }
    int32_t code = 0;
    if (read_int(reply, kErrorCodeKey, &code)) return code;
    return kNoConfigValue;
}

}  // namespace zal::config
