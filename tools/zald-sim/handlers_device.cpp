// Accessory input, video out and device information: video-out mode and options, simple
// buttons (the context page drives the player), rotation input, VoiceOver over a small item
// tree, HID descriptors, lingo versions and options, localization, equaliser profiles,
// battery and power, sound check, Bluetooth and Wi-Fi status, re-authentication.
#include <string>
#include <vector>

#include "handlers.h"
#include "zal-ipod-2/opcodes.h"

namespace sim {

namespace {

// Video-out options the simulated devices support.
constexpr int32_t kVideoOptionsSupported = 0x0F;
// Context button bits that act on the player.
constexpr int32_t kButtonPlayPause = 1 << 0;
constexpr int32_t kButtonVolumeUp = 1 << 1;
constexpr int32_t kButtonVolumeDown = 1 << 2;
constexpr int32_t kButtonNext = 1 << 3;
constexpr int32_t kButtonPrevious = 1 << 4;
constexpr int32_t kVolumeStep = 5;
// VoiceOver: events that move the cursor, parameter range, and the layout of item frames.
enum VoiceOverMove : int32_t { kMoveNext = 0, kMovePrevious = 1, kActivate = 2, kEscape = 3 };
constexpr int32_t kVoiceOverParameterMax = 100;
constexpr int32_t kRowHeight = 40;
constexpr int32_t kRowWidth = 320;
constexpr int32_t kReauthenticationDelayMs = 200;

// n integers from an argument array of exactly n items; false (after an ERROR) otherwise.
bool int_items(Call &c, size_t n, std::vector<int32_t> &out, const char *what) {
    out.assign(n, 0);
    const bool array = c.arg != nullptr && serialize_type(c.arg) == SERIALIZE_ARRAY &&
                       static_cast<size_t>(serialize_array_count(c.arg)) == n;
    for (size_t i = 0; array && i < n; ++i)
        if (!value_as_int(array_item(c.arg, static_cast<uint32_t>(i)), &out[i])) {
            c.fail(std::string(what) + " needs an array of " + std::to_string(n) + " integers");
            return false;
        }
    if (!array) c.fail(std::string(what) + " needs an array of " + std::to_string(n) + " integers");
    return array;
}

// The integer argument, or an ERROR.
bool int_arg(Call &c, int32_t *out, const char *what) {
    if (value_as_int(c.arg, out)) return true;
    c.fail(std::string(what) + " needs an integer argument");
    return false;
}

// ---- Video out and device mode ----

void enter_video_out(Call &c) {
    if (Device *d = c.require_session()) {
        d->accessory.video_out = true;
        c.reply_int(0);
    }
}

void exit_video_out(Call &c) {
    if (Device *d = c.require_session()) {
        d->accessory.video_out = false;
        c.reply_int(0);
    }
}

// 1: the options in force; 0: those the device supports.
void get_video_options(Call &c) {
    Device *d = c.require_session();
    int32_t current = 0;
    if (d == nullptr || !int_arg(c, &current, "GET_VIDEOOUTOPTIONS")) return;
    c.reply_int(current != 0 ? d->accessory.video_options : kVideoOptionsSupported);
}

void set_video_options(Call &c) {
    Device *d = c.require_session();
    int32_t options = 0;
    if (d == nullptr || !int_arg(c, &options, "SET_VIDEOOUTOPTIONS")) return;
    if ((options & ~kVideoOptionsSupported) != 0)
        return c.fail("video-out options " + std::to_string(options) + " are not supported");
    d->accessory.video_options = options;
    c.reply_int(0);
}

void navigate_video_out(Call &c) {
    Device *d = c.require_session();
    int32_t value = 0;
    if (d == nullptr || !int_arg(c, &value, "NAVIGATE_VIDEOOUT")) return;
    if (!d->accessory.video_out) return c.fail("video out is not on");
    c.reply_int(0);
}

// The device's interface mode: 1 in extended mode, else 0.
void get_mode(Call &c) {
    if (Device *d = c.require_session()) c.reply_int(d->extended ? 1 : 0);
}

// Integer settings the device only keeps.
template <int32_t AccessoryState::*field, const char *what>
void keep_int(Call &c) {
    Device *d = c.require_session();
    int32_t value = 0;
    if (d == nullptr || !int_arg(c, &value, what)) return;
    d->accessory.*field = value;
    c.reply_int(0);
}
constexpr char kStateChange[] = "SET_STATECHANGE";
constexpr char kVideoDelay[] = "SET_VIDEO_DELAY";
constexpr char kVoiceOverContext[] = "SET_VOICEOVER_CONTEXT";

// Power settings change what the battery does; the change is announced at once.
template <int32_t AccessoryState::*field, const char *what>
void set_power(Call &c) {
    Device *d = c.require_session();
    int32_t value = 0;
    if (d == nullptr || !int_arg(c, &value, what)) return;
    if (value < 0) return c.fail(std::string(what) + " takes no negative value");
    d->accessory.*field = value;
    c.reply_int(0);
    if (d->accessory.battery_state_now() != d->accessory.battery_state)
        c.world.announce_battery(*d);
}
constexpr char kAvailableCurrent[] = "SET_AVAILABLE_CURRENT";
constexpr char kChargingState[] = "SET_INTERNAL_BATTERY_CHARGING_STATE";

// [current in mA, charging allowed]
void power_source_update(Call &c) {
    Device *d = c.require_session();
    std::vector<int32_t> v;
    if (d == nullptr || !int_items(c, 2, v, "POWER_SOURCE_UPDATE")) return;
    d->accessory.available_current = v[0] < 0 ? 0 : v[0];
    d->accessory.charging_allowed = v[1];
    c.reply_int(0);
    if (d->accessory.battery_state_now() != d->accessory.battery_state)
        c.world.announce_battery(*d);
}

void launch_application(Call &c) {
    Device *d = c.require_session();
    std::string app;
    if (d == nullptr) return;
    if (!value_as_string(c.arg, &app) || app.empty())
        return c.fail("LAUNCHAPPLICATION needs the application's name");
    d->spec.playing_app = app;
    c.reply_int(0);
    c.world.emit(*d, "playing_app", make_string(app));
}

// ---- Buttons, rotation, HID ----

// A button acts when its bit goes from released to pressed.
void context_button(Call &c) {
    Device *d = c.require_session();
    int32_t mask = 0;
    if (d == nullptr || !int_arg(c, &mask, "SIMPLE_CONTEXTBUTTON")) return;
    const int32_t pressed = mask & ~d->accessory.buttons[c.opcode];
    d->accessory.buttons[c.opcode] = mask;
    c.reply_int(0);
    if ((pressed & kButtonPlayPause) != 0 && !d->spec.tracks.empty()) c.world.play_pause(*d);
    if ((pressed & kButtonVolumeUp) != 0) c.world.change_volume(*d, kVolumeStep);
    if ((pressed & kButtonVolumeDown) != 0) c.world.change_volume(*d, -kVolumeStep);
    if ((pressed & kButtonNext) != 0) c.world.next_track(*d);
    if ((pressed & kButtonPrevious) != 0) c.world.previous_track(*d);
}

void other_button(Call &c) {
    Device *d = c.require_session();
    int32_t mask = 0;
    if (d == nullptr || !int_arg(c, &mask, "a simple button command")) return;
    d->accessory.buttons[c.opcode] = mask;
    c.reply_int(0);
}

void rotation_input(Call &c) {
    Device *d = c.require_session();
    std::vector<int32_t> v;
    if (d == nullptr || !int_items(c, 8, v, "ROTAION_IPNUT")) return;
    for (size_t i = 3; i < 6; ++i)
        if (v[i] < 0 || v[i] > 255)
            return c.fail("rotation input field " + std::to_string(i) + " is an 8-bit value");
    for (size_t i = 6; i < 8; ++i)
        if (v[i] < 0 || v[i] > 65535)
            return c.fail("rotation input field " + std::to_string(i) + " is a 16-bit value");
    d->accessory.last_rotation = v;
    c.reply_int(0);
}

// [descriptor, vendor, product, country code, flags]
void register_descriptor(Call &c) {
    Device *d = c.require_session();
    std::vector<int32_t> v;
    if (d == nullptr || !int_items(c, 5, v, "REGISTER_DESCRIPTOR")) return;
    if (!d->accessory.descriptors.insert(v[0]).second)
        return c.fail("HID descriptor " + std::to_string(v[0]) + " is already registered");
    c.reply_int(0);
}

// [descriptor, report type, report]
void hid_report(Call &c) {
    Device *d = c.require_session();
    std::vector<int32_t> v;
    if (d == nullptr || !int_items(c, 3, v, "IPOD_HID_REPORT")) return;
    if (d->accessory.descriptors.count(v[0]) == 0)
        return c.fail("HID descriptor " + std::to_string(v[0]) + " is not registered");
    c.reply_int(0);
}

// [descriptor]
void unregister_descriptor(Call &c) {
    Device *d = c.require_session();
    std::vector<int32_t> v;
    if (d == nullptr || !int_items(c, 1, v, "UNREGISTER_DESCRIPTOR")) return;
    if (d->accessory.descriptors.erase(v[0]) == 0)
        return c.fail("HID descriptor " + std::to_string(v[0]) + " is not registered");
    c.reply_int(0);
}

// ---- VoiceOver ----

// [event, three more 32-bit fields, three 8-bit fields, text]: the event moves the cursor
// (next, previous, into the item, back out); other events are spoken and change nothing.
void voiceover_event(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    const bool shaped = c.arg != nullptr && serialize_type(c.arg) == SERIALIZE_ARRAY &&
                        serialize_array_count(c.arg) == 7 && array_item(c.arg, 6) != nullptr &&
                        serialize_type(array_item(c.arg, 6)) == SERIALIZE_STRING;
    int32_t event = 0;
    if (!shaped || !value_as_int(array_item(c.arg, 0), &event))
        return c.fail("VOICEOVER_EVENT needs an array of six integers and a text");
    std::vector<size_t> &cursor = d->accessory.cursor;
    const VoiceOverItem *item = voiceover_item(cursor);
    const size_t count = voiceover_siblings(cursor)->size();
    switch (event) {
        case kMoveNext:
            cursor.back() = (cursor.back() + 1) % count;
            break;
        case kMovePrevious:
            cursor.back() = (cursor.back() + count - 1) % count;
            break;
        case kActivate:
            if (item == nullptr || item->children.empty()) return c.fail("the item has no items");
            cursor.push_back(0);
            break;
        case kEscape:
            if (cursor.size() == 1) return c.fail("the cursor is at the top");
            cursor.pop_back();
            break;
        default:
            break;
    }
    c.reply_int(0);
}

// Property types 0 label, 1 value, 2 hint (each with the item's index among its siblings),
// 3 the item's frame on the screen.
void voiceover_item_property(Call &c) {
    Device *d = c.require_session();
    int32_t type = 0;
    if (d == nullptr || !int_arg(c, &type, "GET_CURRENT_VOICEOVER_ITEMPROPERTY")) return;
    const std::vector<size_t> &cursor = d->accessory.cursor;
    const VoiceOverItem *item = voiceover_item(cursor);
    HashBuilder reply;
    if (item == nullptr || type < 0 || type > 3)
        return c.reply(reply.add("get_current_voiceover_itemproperty", 0).take());
    reply.add("get_current_voiceover_itemproperty", 1).add("type", type);
    const auto index = static_cast<int32_t>(cursor.back());
    if (type == 3) {
        reply.add("topleft_x", 0).add("topleft_y", index * kRowHeight);
        reply.add("bottomright_x", kRowWidth).add("bottomright_y", (index + 1) * kRowHeight);
        return c.reply(reply.take());
    }
    const std::string hint = item->children.empty() ? "" : "Double tap to open";
    const std::string &name = type == 0 ? item->label : type == 1 ? item->value : hint;
    reply.add("current_index", index)
        .add("last_index", static_cast<int32_t>(voiceover_siblings(cursor)->size()) - 1)
        .add("name", name);
    c.reply(reply.take());
}

void get_voiceover_parameter(Call &c) {
    Device *d = c.require_session();
    int32_t parameter = 0;
    if (d == nullptr || !int_arg(c, &parameter, "GET_VOICEOVER_PARAMETER")) return;
    auto found = d->accessory.voiceover_parameters.find(parameter);
    if (found == d->accessory.voiceover_parameters.end())
        return c.reply(HashBuilder().add("get_voiceover_parameter", 0).take());
    c.reply(HashBuilder().add("get_voiceover_parameter", 1).add("value", found->second).take());
}

void set_voiceover_parameter(Call &c) {
    Device *d = c.require_session();
    std::vector<int32_t> v;
    if (d == nullptr || !int_items(c, 2, v, "SET_VOICEOVER_PARAMETER")) return;
    auto found = d->accessory.voiceover_parameters.find(v[0]);
    if (found == d->accessory.voiceover_parameters.end())
        return c.fail("unknown VoiceOver parameter " + std::to_string(v[0]));
    if (v[1] < 0 || v[1] > kVoiceOverParameterMax)
        return c.fail("VoiceOver value " + std::to_string(v[1]) + " is outside 0..100");
    found->second = v[1];
    c.reply_int(0);
}

// ---- Device information ----

void request_lingo_version(Call &c) {
    int32_t number = 0;
    if (c.require_session() == nullptr || !int_arg(c, &number, "REQUEST_LINGO_VERSION")) return;
    const Lingo *lingo = find_lingo(number);
    if (lingo == nullptr) return c.reply(HashBuilder().add("request_lingo_version", 0).take());
    c.reply(HashBuilder()
                .add("request_lingo_version", 1)
                .add("major", lingo->major)
                .add("minor", lingo->minor)
                .take());
}

// Eight bytes, most significant first.
void lingo_options(Call &c) {
    int32_t number = 0;
    if (c.require_session() == nullptr || !int_arg(c, &number, "LINGO_OPTIONS")) return;
    const Lingo *lingo = find_lingo(number);
    if (lingo == nullptr) return c.fail("unknown lingo " + std::to_string(number));
    unsigned char bytes[8];
    for (int i = 0; i < 8; ++i)
        bytes[i] = static_cast<unsigned char>(lingo->options >> (56 - 8 * i));
    c.reply(ValuePtr(serialize_bytes(bytes, sizeof bytes)));
}

void localization_info(Call &c) {
    Device *d = c.require_session();
    int32_t type = 0;
    if (d == nullptr || !int_arg(c, &type, "LOCALIZATION_INFO")) return;
    const auto &texts = d->spec.accessory.localization;
    if (type < 0 || static_cast<size_t>(type) >= texts.size())
        return c.fail("no localization of type " + std::to_string(type));
    c.reply(HashBuilder().add("type", type).add("data", texts[static_cast<size_t>(type)]).take());
}

void get_eq_index(Call &c) {
    if (Device *d = c.require_session())
        c.reply(HashBuilder()
                    .add("get_current_eqprofile_index", 1)
                    .add("index", d->accessory.eq_index)
                    .take());
}

// [index, restore on exit]
void set_eq_index(Call &c) {
    Device *d = c.require_session();
    std::vector<int32_t> v;
    if (d == nullptr || !int_items(c, 2, v, "SET_CURRENT_EQPROFILE_INDEX")) return;
    if (v[0] < 0 || static_cast<size_t>(v[0]) >= d->spec.accessory.eq_profiles.size())
        return c.fail("no equaliser profile " + std::to_string(v[0]));
    d->accessory.eq_index = v[0];
    c.reply_int(0);
}

void eq_count(Call &c) {
    if (Device *d = c.require_session())
        c.reply(HashBuilder()
                    .add("get_num_eqprofiles", 1)
                    .add("number", static_cast<int32_t>(d->spec.accessory.eq_profiles.size()))
                    .take());
}

void eq_name(Call &c) {
    Device *d = c.require_session();
    int32_t index = 0;
    if (d == nullptr || !int_arg(c, &index, "GET_INDEXED_EQPROFILE_NAME")) return;
    const auto &names = d->spec.accessory.eq_profiles;
    if (index < 0 || static_cast<size_t>(index) >= names.size())
        return c.reply(HashBuilder().add("get_indexed_eqprofile_name", 0).take());
    c.reply(HashBuilder()
                .add("get_indexed_eqprofile_name", 1)
                .add("name", names[static_cast<size_t>(index)])
                .take());
}

void battery_state(Call &c) {
    if (Device *d = c.require_session())
        c.reply(HashBuilder()
                    .add("get_power_battery_state", 1)
                    .add("state", d->accessory.battery_state)
                    .add("level", d->accessory.battery_level)
                    .take());
}

void get_sound_check(Call &c) {
    if (Device *d = c.require_session())
        c.reply(HashBuilder()
                    .add("get_sound_check_state", 1)
                    .add("state", d->accessory.sound_check)
                    .take());
}

// [state, restore on exit]
void set_sound_check(Call &c) {
    Device *d = c.require_session();
    std::vector<int32_t> v;
    if (d == nullptr || !int_items(c, 2, v, "SET_SOUND_CHECK_STATE")) return;
    if (v[0] != 0 && v[0] != 1) return c.fail("sound check is 0 or 1");
    d->accessory.sound_check = v[0];
    c.reply_int(0);
}

void bt_connection_status(Call &c) {
    if (Device *d = c.require_session())
        c.reply(
            HashBuilder()
                .add("current_bt_status",
                     std::string(d->spec.link == Link::kBluetooth ? "connected" : "disconnected"))
                .take());
}

// The device answers with its Wi-Fi network as an event.
void request_wifi_info(Call &c) {
    Device *d = c.require_session();
    if (d == nullptr) return;
    c.reply_int(0);
    c.world.emit(*d, "wifi_information",
                 HashBuilder()
                     .add("wifi_status", 0)
                     .add("wifi_type", 1)
                     .add("ssid", std::string("SimHotspot"))
                     .add("passphrase", std::string("simulated-passphrase"))
                     .take());
}

// The device authenticates the accessory again: "authenticated" 1 after a short while.
void reauthentication(Call &c) {
    Device *d = c.require_session();
    int32_t value = 0;
    if (d == nullptr || !int_arg(c, &value, "REAUTHENTICATION")) return;
    c.reply_int(0);
    const int32_t id = d->id;
    World &world = c.world;
    world.after(kReauthenticationDelayMs, [&world, id] {
        Device *again = world.by_id(id);
        if (again != nullptr && again->present && again->authenticated)
            world.emit_int(*again, "authenticated", 1);
    });
}

struct Entry {
    uint8_t opcode;
    Handler handler;
};

const Entry kDevice[] = {
    {ZAL_OP_ENTER_VIDEOOUTMODE, enter_video_out},
    {ZAL_OP_EXIT_VIDEOOUTMODE, exit_video_out},
    {ZAL_OP_GET_VIDEOOUTOPTIONS, get_video_options},
    {ZAL_OP_SET_VIDEOOUTOPTIONS, set_video_options},
    {ZAL_OP_NAVIGATE_VIDEOOUT, navigate_video_out},
    {ZAL_OP_GET_MODE, get_mode},
    {ZAL_OP_SET_STATECHANGE, keep_int<&AccessoryState::state_change, kStateChange>},
    {ZAL_OP_SET_VIDEO_DELAY, keep_int<&AccessoryState::video_delay, kVideoDelay>},
    {ZAL_OP_SET_VOICEOVER_CONTEXT, keep_int<&AccessoryState::voiceover_context, kVoiceOverContext>},
    {ZAL_OP_SET_AVAILABLE_CURRENT,
     set_power<&AccessoryState::available_current, kAvailableCurrent>},
    {ZAL_OP_SET_INTERNAL_BATTERY_CHARGING_STATE,
     set_power<&AccessoryState::charging_allowed, kChargingState>},
    {ZAL_OP_POWER_SOURCE_UPDATE, power_source_update},
    {ZAL_OP_LAUNCHAPPLICATION, launch_application},
    {ZAL_OP_SIMPLE_CONTEXTBUTTON, context_button},
    {ZAL_OP_SIMPLE_VIDEOBUTTON, other_button},
    {ZAL_OP_SIMPLE_AUDIOBUTTON, other_button},
    {ZAL_OP_SIMPLE_RADIOBUTTON, other_button},
    {ZAL_OP_SIMPLE_CAMERABUTTON, other_button},
    {ZAL_OP_ROTAION_IPNUT, rotation_input},
    {ZAL_OP_REGISTER_DESCRIPTOR, register_descriptor},
    {ZAL_OP_IPOD_HID_REPORT, hid_report},
    {ZAL_OP_UNREGISTER_DESCRIPTOR, unregister_descriptor},
    {ZAL_OP_VOICEOVER_EVENT, voiceover_event},
    {ZAL_OP_GET_CURRENT_VOICEOVER_ITEMPROPERTY, voiceover_item_property},
    {ZAL_OP_GET_VOICEOVER_PARAMETER, get_voiceover_parameter},
    {ZAL_OP_SET_VOICEOVER_PARAMETER, set_voiceover_parameter},
    {ZAL_OP_REQUEST_LINGO_VERSION, request_lingo_version},
    {ZAL_OP_LINGO_OPTIONS, lingo_options},
    {ZAL_OP_LOCALIZATION_INFO, localization_info},
    {ZAL_OP_GET_CURRENT_EQPROFILE_INDEX, get_eq_index},
    {ZAL_OP_SET_CURRENT_EQPROFILE_INDEX, set_eq_index},
    {ZAL_OP_GET_NUM_EQPROFILES, eq_count},
    {ZAL_OP_GET_INDEXED_EQPROFILE_NAME, eq_name},
    {ZAL_OP_GET_POWER_BATTERY_STATE, battery_state},
    {ZAL_OP_GET_SOUND_CHECK_STATE, get_sound_check},
    {ZAL_OP_SET_SOUND_CHECK_STATE, set_sound_check},
    {ZAL_OP_GET_BT_CONNECTION_STATUS, bt_connection_status},
    {ZAL_OP_REQUEST_WIFI_CONNECTION_INFO, request_wifi_info},
    {ZAL_OP_REAUTHENTICATION, reauthentication},
};

}  // namespace

void register_device_handlers(HandlerTable &table) {
    for (const Entry &e : kDevice) table[e.opcode] = e.handler;
}

}  // namespace sim
