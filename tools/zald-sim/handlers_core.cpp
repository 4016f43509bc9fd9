// Connection and session requests, and the runtime configuration keys.
#include <string>

#include "handlers.h"
#include "sim_log.h"
#include "zal-ipod-2/opcodes.h"

namespace sim {

namespace {

void hello(Call &c) {
    c.reply(c.world.device_list());
}

void keep_alive(Call &c) {
    c.reply_int(0);
}

ValuePtr session_reply(Call &c, int32_t result) {
    return HashBuilder()
        .add("result", result)
        .add("devices", c.world.device_list().release())
        .take();
}

// Payload: the device's index in the device list. An index that names no device opens
// nothing and answers "result" 0; a connection has at most one session, so opening another
// closes the previous one first.
void open_session(Call &c) {
    int32_t index = 0;
    if (!value_as_int(c.arg, &index))
        return c.fail("OPEN_SESSION needs the device index as an integer");
    const auto devices = c.world.present();
    if (index < 0 || index >= static_cast<int32_t>(devices.size())) {
        SIM_LOGW("zald-sim: OPEN_SESSION for device index %d, which does not exist\n", index);
        return c.reply(session_reply(c, 0));
    }
    Device *previous = c.session_device();
    if (previous != nullptr) c.world.leave_session(*previous);
    Device &device = *devices[static_cast<size_t>(index)];
    c.session.device_id = device.id;
    c.world.join_session(device);
    SIM_LOGI("zald-sim: session opened on %s (iAP%d)\n", device.spec.serial.c_str(),
             device.spec.protocol);
    c.reply(session_reply(c, 1));
    if (previous != nullptr && previous != &device) c.world.settle_session(*previous);
    if (previous != &device) c.world.announce_session(device);
}

void close_session(Call &c) {
    Device *device = c.session_device();
    c.session.device_id = 0;
    if (device != nullptr) c.world.leave_session(*device);
    c.reply(session_reply(c, device != nullptr ? 1 : 0));
    if (device != nullptr) c.world.settle_session(*device);
}

// Payload: array of two strings, key and value.
void set_config(Call &c) {
    std::string key, value;
    if (!value_as_string(array_item(c.arg, 0), &key) ||
        !value_as_string(array_item(c.arg, 1), &value))
        return c.fail("SET_CONFIG needs an array of two strings: key, value");
    const ConfigOutcome outcome = c.config.set(key, value);
    SIM_LOGI("zald-sim: SET_CONFIG %s=%s -> %d\n", key.c_str(), value.c_str(), outcome);
    c.reply(HashBuilder()
                .add("config_updated_cfg", static_cast<int32_t>(outcome))
                .add("config_updated_ctx", outcome == kConfigUpdated ? 1 : 0)
                .take());
}

// Payload: array holding the key (a bare string is accepted too).
void get_config(Call &c) {
    std::string key;
    if (!value_as_string(array_item(c.arg, 0), &key) && !value_as_string(c.arg, &key))
        return c.fail("GET_CONFIG needs an array holding the key");
    if (auto value = c.config.get(key))
        return c.reply(HashBuilder().add("config_val", *value).take());
    c.reply(HashBuilder().add("config_val_errorcode", kConfigUnknownKey).take());
}

}  // namespace

void register_core_handlers(HandlerTable &table) {
    table[ZAL_OP_HELLO] = hello;
    table[ZAL_OP_KEEP_ALIVE] = keep_alive;
    table[ZAL_OP_OPEN_SESSION] = open_session;
    table[ZAL_OP_CLOSE_SESSION] = close_session;
    table[ZAL_OP_SET_CONFIG] = set_config;
    table[ZAL_OP_GET_CONFIG] = get_config;
}

}  // namespace sim
