// The table of context-backed keys.
#include "context_keys.h"

#include <cstring>
#include <string>
#include <vector>

#include "zal-ipod-2/common.h"

namespace sim {

namespace {

using TextSetter = void (*)(context *, const char *);

// A text field written by a setter that refuses what does not fit: the write took when the
// field reads back as the value.
struct TextKey {
    const char *key;
    TextSetter setter;
    char (context::*field)[ZAL_CONTEXT_TEXT_SIZE];
};

const TextKey kTextKeys[] = {
    {"media_library_db_path", set_context_media_library_db_path, &context::media_library_db_path},
    {"artwork_path", set_context_artwork_path, &context::artwork_path},
    {"vehicle_information_component_name", set_context_vehicle_information_component_name,
     &context::vehicle_information_component_name},
    {"vehicle_information_component_displayName",
     set_context_vehicle_information_component_displayName,
     &context::vehicle_information_component_displayName},
    {"accessory_wifi_ssid", set_context_accessory_wifi_ssid, &context::accessory_wifi_ssid},
    {"accessory_wifi_passphrase", set_context_accessory_wifi_passphrase,
     &context::accessory_wifi_passphrase},
};

// Fields the command line sets once; clients may read them.
struct ReadOnlyKey {
    const char *key;
    char (context::*field)[ZAL_CONTEXT_TEXT_SIZE];
};

const ReadOnlyKey kReadOnlyKeys[] = {
    {"socket_name", &context::socket_name},
    {"config_path", &context::config_path},
    {"bt_name", &context::bt_name},
};

std::string eap_text(const context &ctx) {
    std::string text;
    for (const eap_node *n = ctx.eap; n != nullptr; n = n->next) {
        if (n != ctx.eap) text += ",";
        if (n->name != nullptr) text += n->name;
    }
    return text;
}

std::string version_text() {
    int a = 0, b = 0, c = 0;
    getReleaseVersion(&a, &b, &c);
    return std::to_string(a) + "." + std::to_string(b) + "." + std::to_string(c);
}

}  // namespace

void bind_context_keys(ConfigStore &store, context &ctx) {
    context *c = &ctx;
    for (const ReadOnlyKey &k : kReadOnlyKeys) {
        auto field = k.field;
        store.bind(k.key, true, nullptr, [c, field] { return std::string(c->*field); });
    }
    store.define("version", version_text(), true);
    for (const TextKey &k : kTextKeys) {
        auto field = k.field;
        auto setter = k.setter;
        store.bind(
            k.key, false,
            [c, field, setter](const std::string &v) {
                setter(c, v.c_str());
                return v == c->*field;
            },
            [c, field] { return std::string(c->*field); });
    }
    store.bind(
        "device", false,
        [c](const std::string &v) {
            if (v.size() >= sizeof c->device) return false;
            memcpy(c->device, v.c_str(), v.size() + 1);
            return true;
        },
        [c] { return std::string(c->device); });
    store.bind(
        "bt_address", false,
        [c](const std::string &v) { return set_context_bt_address(c, v.c_str()) == 1; },
        [c] { return std::string(c->bt_address); });
    store.bind(
        "eap", false,
        [c](const std::string &v) {
            std::vector<char> list(v.begin(), v.end());
            list.push_back('\0');  // the setter splits its argument in place
            return set_context_eap(c, list.data()) == 1;
        },
        [c] { return eap_text(*c); });
    store.bind(
        "app_match_team_id", false,
        [c](const std::string &v) { return set_context_app_match_team_id(c, v.c_str()) == 1; },
        [c] { return std::string(c->app_match_team_id ? c->app_match_team_id : ""); });
    store.bind(
        "highest_protocol_mode", false,
        [c](const std::string &v) { return set_context_highest_protocol_mode(c, v.c_str()) == 1; },
        [c] { return std::to_string(c->highest_protocol_mode); });
    store.bind(
        "vehicle_information_component_engine_type", false,
        [c](const std::string &v) {
            set_context_vehicle_information_component_engine_type(c, v.c_str());
            return true;
        },
        [c] { return std::to_string(c->vehicle_information_component_engine_type); });
}

}  // namespace sim
