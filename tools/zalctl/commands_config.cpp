// config get KEY / config set KEY VALUE: the daemon's runtime configuration.
#include <cstdio>

#include "zalctl.h"

namespace zalctl {

namespace {

// The asynchronous form plus our own decoding: the _sync form copies the value into a
// buffer whose size only the daemon knows, and the value comes from another process.
void get_config(Session &s, const std::string &key) {
    zal_ipod_handle *h = s.handle();
    const uint16_t tid = zal_ipod_get_config(h, key.c_str());
    if (tid == 0) throw Failure("config get: the request could not be sent");
    zal_ipod_reply *reply = zal_ipod_wait_for_tid(h, tid);
    if (reply == nullptr)
        throw Failure("config get: no reply from the daemon within " +
                      std::to_string(s.options.timeout_s) + " s, or the connection was lost");
    gval *v = reply->length > 0 ? unserialize(reply->payload, reply->length) : nullptr;
    const bool error = reply->opcode == ZAL_OP_ERROR;
    zal_ipod_reply_free(reply);
    const gval *value =
        serialize_type(v) == SERIALIZE_HASH ? serialize_hash_get(v, "config_val") : nullptr;
    const gval *error_text =
        serialize_type(v) == SERIALIZE_HASH ? serialize_hash_get(v, "error") : nullptr;
    std::string text;
    std::string problem;
    if (value != nullptr && serialize_type(value) == SERIALIZE_STRING)
        text = serialize_get_string(value);
    else if (error && error_text != nullptr && serialize_type(error_text) == SERIALIZE_STRING)
        problem = serialize_get_string(error_text);
    else
        problem = "the daemon has no key \"" + key + "\"";
    serialize_free(v);
    if (!problem.empty()) throw Failure("config get: " + problem);
    if (s.options.json)
        print_json(Json{{"key", key}, {"value", text}});
    else
        printf("%s\n", text.c_str());
}

void set_config(Session &s, const std::string &key, const std::string &value) {
    const int32_t result =
        s.expect(zal_ipod_set_config_sync(s.handle(), key.c_str(), value.c_str()), "config set");
    // 0: the daemon refused (an unknown or read-only key, or a value it does not take).
    if (result != 1)
        throw Failure("config set: the daemon did not accept " + key + "=" + value +
                      " (unknown or read-only key, or a value it refuses)");
    if (s.options.json)
        print_json(Json{{"key", key}, {"value", value}, {"updated", true}});
    else
        printf("%s = %s\n", key.c_str(), value.c_str());
}

}  // namespace

void add_config_commands(CLI::App &app, Session &s) {
    CLI::App *config = app.add_subcommand("config", "Read or write the daemon's configuration");
    config->require_subcommand(1);

    // The strings live as long as the App (main's scope), as CLI11 requires.
    static std::string key;
    static std::string value;
    CLI::App *get = config->add_subcommand("get", "Print the value of KEY");
    get->add_option("KEY", key, "Configuration key, e.g. device or version")->required();
    on_run(get, s, [&s] { get_config(s, key); });

    CLI::App *set = config->add_subcommand("set", "Set KEY to VALUE");
    set->add_option("KEY", key, "Configuration key")->required();
    set->add_option("VALUE", value, "New value")->required();
    on_run(set, s, [&s] { set_config(s, key, value); });
}

}  // namespace zalctl
