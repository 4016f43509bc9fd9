// Communications and vehicle integration: telephony reports (a scripted call after the
// start), EAP datagrams echoed back as incoming datagrams, location and vehicle status
// answers, the Bluetooth component state and the accessory's Wi-Fi access point.
#include <string>

#include "handlers.h"
#include "sim_log.h"
#include "zal-ipod-2/opcodes.h"

namespace sim {

namespace {

// Call states and directions as the devices report them.
enum CallStatus : int32_t { kDisconnected = 0, kRinging = 2, kActive = 4 };
constexpr int32_t kIncoming = 1;
constexpr int32_t kServiceTelephony = 1;

// The call every start of the call state reports plays: it rings, is answered, ends.
struct CallStep {
    Millis at_ms;
    int32_t status;
};
constexpr CallStep kCallScript[] = {{500, kRinging}, {2500, kActive}, {6500, kDisconnected}};

ValuePtr call_state(int32_t status) {
    HashBuilder call;
    call.add("RemoteID", std::string("+15550100"))
        .add("DisplayName", std::string("Sim Caller"))
        .add("Status", status)
        .add("Direction", kIncoming)
        .add("CallUUID", std::string("sim-call-0001"))
        .add("AddressBookID", std::string("42"))
        .add("Label", std::string("mobile"))
        .add("Service", kServiceTelephony)
        .add("IsConferenced", 0)
        .add("ConferenceGroup", 0)
        .add("DisconnectReason", 0);
    return call.take();
}

ValuePtr telephony_status() {
    HashBuilder status;
    status.add("signal_strength", 4)
        .add("registration_status", 2)
        .add("airplane_mode_status", 0)
        .add("carrier_name", std::string("SimTel"))
        .add("cellular_supported", 1)
        .add("telephony_enabled", 1)
        .add("facetime_audio_enabled", 1)
        .add("facetime_video_enabled", 0)
        .add("mute_status", 0)
        .add("current_call_count", 0)
        .add("new_voicemail_count", 1)
        .add("initiate_call_available", 1)
        .add("end_and_accept_available", 0)
        .add("hold_and_accept_available", 0)
        .add("swap_available", 0)
        .add("merge_available", 0)
        .add("hold_available", 0);
    return status.take();
}

// A new start, or a stop, voids the steps of the call scheduled before.
void start_callstate(Call &c) {
    Device *d = c.require_session();
    int32_t value = 0;
    if (d == nullptr) return;
    if (!value_as_int(c.arg, &value))
        return c.fail("START_TELEPHONY_CALLSTATE_INFORMATION needs an integer argument");
    const int32_t generation = ++d->accessory.call_generation;
    c.reply_int(0);
    const int32_t id = d->id;
    World &world = c.world;
    for (const CallStep &step : kCallScript) {
        world.after(step.at_ms, [&world, id, generation, status = step.status] {
            Device *device = world.by_id(id);
            if (device == nullptr || !device->present ||
                device->accessory.call_generation != generation)
                return;
            world.emit(*device, "telephony_callstate_information", call_state(status));
        });
    }
}

void stop_callstate(Call &c) {
    if (Device *d = c.require_session()) {
        ++d->accessory.call_generation;
        c.reply_int(0);
    }
}

void start_telephony_update(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    d->accessory.telephony_updates = true;
    c.reply_int(0);
    c.world.emit(*d, "telephony_update", telephony_status());
}

void stop_telephony_update(Call &c) {
    if (Device *d = c.require_session()) {
        d->accessory.telephony_updates = false;
        c.reply_int(0);
    }
}

// [session id, length, bytes]: the application on the device answers with the same bytes.
void eap_datagram(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    int32_t session_id = 0, length = 0;
    const gval *bytes = array_item(c.arg, 2);
    uint32_t size = 0;
    const void *data = bytes != nullptr && serialize_type(bytes) == SERIALIZE_BYTES
                           ? serialize_get_bytes(bytes, &size)
                           : nullptr;
    if (!value_as_int(array_item(c.arg, 0), &session_id) ||
        !value_as_int(array_item(c.arg, 1), &length) || data == nullptr)
        return c.fail("SEND_EAP_DATAGRAM needs [session id, length, bytes]");
    if (length < 0 || static_cast<uint32_t>(length) != size)
        return c.fail("the datagram holds " + std::to_string(size) + " bytes, not " +
                      std::to_string(length));
    c.reply_int(0);
    c.world.emit(*d, "data_session",
                 HashBuilder()
                     .add("session_id", session_id)
                     .add("protocol_index", 0)
                     .add("data", serialize_bytes(data, size))
                     .take());
}

void location_information(Call &c) {
    Device *d = c.require_session();
    std::string text;
    if (d == nullptr) return;
    if (!value_as_string(c.arg, &text) || text.empty())
        return c.fail("SEND_LOCATION_INFO needs the location data");
    ++d->accessory.location_reports;
    c.reply_int(0);
}

// [a, b, c, d, e]: the items the device asked for, in its order.
void vehicle_status(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    const bool shaped = c.arg != nullptr && serialize_type(c.arg) == SERIALIZE_ARRAY &&
                        serialize_array_count(c.arg) == 5;
    int32_t v = 0;
    for (uint32_t i = 0; shaped && i < 5; ++i)
        if (!value_as_int(array_item(c.arg, i), &v))
            return c.fail("SEND_VEHICLE_STATUS_UPDATE needs five integers");
    if (!shaped) return c.fail("SEND_VEHICLE_STATUS_UPDATE needs five integers");
    ++d->accessory.vehicle_reports;
    c.reply_int(0);
}

void bluetooth_component(Call &c) {
    Device *d = c.require_session();
    int32_t state = 0;
    if (d == nullptr) return;
    if (!value_as_int(c.arg, &state))
        return c.fail("SET_BT_COMPONENT_STATE needs an integer argument");
    c.reply_int(0);
}

// [ssid, passphrase, value, value]; served without a session: the access point is set up
// before any device is in use.
void wifi_configuration(Call &c) {
    std::string ssid, passphrase;
    int32_t first = 0, second = 0;
    if (!value_as_string(array_item(c.arg, 0), &ssid) ||
        !value_as_string(array_item(c.arg, 1), &passphrase) ||
        !value_as_int(array_item(c.arg, 2), &first) || !value_as_int(array_item(c.arg, 3), &second))
        return c.fail("the Wi-Fi configuration needs [ssid, passphrase, value, value]");
    if (ssid.empty()) return c.fail("the Wi-Fi configuration needs an ssid");
    SIM_LOGI("zald-sim: accessory Wi-Fi \"%s\" (%d, %d)\n", ssid.c_str(), first, second);
    c.reply_int(0);
}

struct Entry {
    uint8_t opcode;
    Handler handler;
};

const Entry kComms[] = {
    {ZAL_OP_START_TELEPHONY_CALLSTATE_INFORMATION, start_callstate},
    {ZAL_OP_STOP_TELEPHONY_CALLSTATE_INFORMATION, stop_callstate},
    {ZAL_OP_START_TELEPHONY_UPDATE, start_telephony_update},
    {ZAL_OP_STOP_TELEPHONY_UPDATE, stop_telephony_update},
    {ZAL_OP_SEND_EAP_DATAGRAM, eap_datagram},
    {ZAL_OP_SEND_LOCATION_INFO, location_information},
    {ZAL_OP_SEND_VEHICLE_STATUS_UPDATE, vehicle_status},
    {ZAL_OP_SET_BT_COMPONENT_STATE, bluetooth_component},
    {ZAL_OP_SEND_ACCESSORY_WIFI_CONFIGURATION, wifi_configuration},
};

}  // namespace

void register_comms_handlers(HandlerTable &table) {
    for (const Entry &e : kComms) table[e.opcode] = e.handler;
}

}  // namespace sim
