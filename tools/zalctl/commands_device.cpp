// Device information, accessory input and communications: info (lingo versions,
// localization, battery, equaliser), eq list / set, button, voiceover, call-state and
// eap send.
#include <fcntl.h>
#include <unistd.h>

#include <cinttypes>
#include <cstdio>
#include <cstring>
#include <map>
#include <vector>

#include "zalctl.h"

namespace zalctl {

namespace {

using Clock = std::chrono::steady_clock;

// The lingo version query writes trace lines to the process's standard error, which is
// zalctl's own channel for failures: they are kept out unless --verbose.
class QuietStderr {
  public:
    explicit QuietStderr(bool keep) {
        if (keep) return;
        fflush(stderr);
        saved_ = dup(STDERR_FILENO);
        const int null = open("/dev/null", O_WRONLY | O_CLOEXEC);
        if (saved_ >= 0 && null >= 0) dup2(null, STDERR_FILENO);
        if (null >= 0) close(null);
    }
    ~QuietStderr() {
        if (saved_ < 0) return;
        fflush(stderr);
        dup2(saved_, STDERR_FILENO);
        close(saved_);
    }
    QuietStderr(const QuietStderr &) = delete;
    QuietStderr &operator=(const QuietStderr &) = delete;

  private:
    int saved_ = -1;
};

struct LingoName {
    int number;
    const char *name;
};
constexpr LingoName kLingos[] = {{0x00, "general"},
                                 {0x02, "simple remote"},
                                 {0x03, "display remote"},
                                 {0x04, "extended interface"},
                                 {0x0a, "digital audio"}};

const char *battery_state_name(int state) {
    switch (state) {
        case 1:
            return "discharging";
        case 2:
            return "charging";
        case 3:
            return "full";
        default:
            return "unknown";
    }
}

// The equaliser profile's name; the library fills at most 64 bytes, unterminated when the
// name is that long, so the text is taken with its bound.
std::string eq_name(Session &s, int index) {
    char name[ZAL_EQPROFILE_NAME_SIZE];
    s.expect(zal_ipod_get_indexed_eqprofile_name_sync(s.handle(), index, name), "eq name");
    return std::string(name, strnlen(name, sizeof name));
}

std::string hex64(uint64_t v) {
    char text[24];
    snprintf(text, sizeof text, "0x%016" PRIx64, v);
    return text;
}

// ---- info ----

void show_info(Session &s) {
    zal_ipod_handle *h = s.with_session();
    Json lingos = Json::array();
    for (const LingoName &l : kLingos) {
        int32_t ok;
        {
            QuietStderr quiet(s.options.verbose);
            ok = zal_ipod_request_lingo_version_sync(h, l.number);
        }
        if (ok != 1) continue;  // a lingo the device does not speak
        const uint64_t options = zal_ipod_get_lingo_options_sync(h, l.number);
        lingos.push_back(Json{{"lingo", l.number},
                              {"name", l.name},
                              {"version", zal_ipod_get_result_lingo_version(h)},
                              {"major", zal_ipod_get_result_lingo_version_major(h)},
                              {"minor", zal_ipod_get_result_lingo_version_minor(h)},
                              {"options", hex64(options)}});
    }
    s.expect(zal_ipod_localization_info_sync(h, 0), "localization");
    s.expect(zal_ipod_localization_info_sync(h, 1), "localization");
    const std::string language = zal_ipod_current_localization_info(h, 0);
    const std::string region = zal_ipod_current_localization_info(h, 1);
    int state = 0, level = 0;
    s.expect(zal_ipod_get_power_battery_state_sync(h, &state, &level), "battery");
    const int32_t count = s.expect(zal_ipod_get_num_eqprofiles_sync(h), "eq count");
    const int32_t current = s.expect(zal_ipod_get_current_eqprofile_index_sync(h), "eq index");
    const std::string profile = eq_name(s, current);
    if (s.options.json) {
        print_json(
            Json{{"lingos", lingos},
                 {"localization", {{"language", language}, {"region", region}}},
                 {"battery",
                  {{"state", state}, {"state_name", battery_state_name(state)}, {"level", level}}},
                 {"equaliser", {{"index", current}, {"name", profile}, {"count", count}}}});
        return;
    }
    for (const Json &l : lingos)
        printf("lingo 0x%02x:   %-19s %s  options %s\n", l["lingo"].get<int>(),
               l["name"].get<std::string>().c_str(), l["version"].get<std::string>().c_str(),
               l["options"].get<std::string>().c_str());
    printf("localization: %s / %s\n", language.c_str(), region.c_str());
    printf("battery:      %d%% %s\n", level, battery_state_name(state));
    printf("equaliser:    %d %s (of %d)\n", current, profile.c_str(), count);
}

// ---- eq ----

void list_eq(Session &s) {
    zal_ipod_handle *h = s.with_session();
    const int32_t count = s.expect(zal_ipod_get_num_eqprofiles_sync(h), "eq list");
    const int32_t current = s.expect(zal_ipod_get_current_eqprofile_index_sync(h), "eq list");
    Json profiles = Json::array();
    for (int32_t i = 0; i < count; ++i) profiles.push_back(eq_name(s, i));
    if (s.options.json) {
        print_json(Json{{"current", current}, {"profiles", profiles}});
        return;
    }
    for (int32_t i = 0; i < count; ++i)
        printf("%c %2d %s\n", i == current ? '*' : ' ', i,
               profiles[static_cast<size_t>(i)].get<std::string>().c_str());
}

void set_eq(Session &s, int index) {
    zal_ipod_handle *h = s.with_session();
    s.expect(zal_ipod_set_current_eqprofile_index_sync(h, index, 0), "eq set");
    const std::string name = eq_name(s, index);
    if (s.options.json)
        print_json(Json{{"current", index}, {"name", name}});
    else
        printf("equaliser: %d %s\n", index, name.c_str());
}

// ---- button ----

// Context buttons as a bit mask each; a press is the mask, then all released.
const std::map<std::string, int> kButtons = {
    {"playpause", 0x01}, {"volume-up", 0x02}, {"volume-down", 0x04},
    {"next", 0x08},      {"previous", 0x10},
};

void press_button(Session &s, const std::string &name) {
    zal_ipod_handle *h = s.with_session();
    const int mask = kButtons.at(name);
    s.expect(zal_ipod_simple_contextbutton_sync(h, mask), "button press");
    s.expect(zal_ipod_simple_contextbutton_sync(h, 0), "button release");
    if (s.options.json)
        print_json(Json{{"button", name}, {"mask", mask}, {"pressed", true}});
    else
        printf("button %s pressed and released\n", name.c_str());
}

// ---- voiceover ----

constexpr const char *kItemTypes[] = {"label", "value", "hint"};

Json voiceover_item(Session &s) {
    zal_ipod_handle *h = s.with_session();
    Json item = Json::object();
    for (int type = 0; type < 3; ++type) {
        s.expect(zal_ipod_get_current_voiceover_itemproperty_sync(h, type), "voiceover item");
        item[kItemTypes[type]] = zal_ipod_voiceover_item_name(h, type);
        if (type == 0) {
            item["index"] = zal_ipod_voiceover_item_current_index(h, 0);
            item["last_index"] = zal_ipod_voiceover_item_last_index(h, 0);
        }
    }
    s.expect(zal_ipod_get_current_voiceover_itemproperty_sync(h, 3), "voiceover frame");
    item["frame"] = {zal_ipod_voiceover_item_topleft_x(h), zal_ipod_voiceover_item_topleft_y(h),
                     zal_ipod_voiceover_item_bottomright_x(h),
                     zal_ipod_voiceover_item_bottomright_y(h)};
    return item;
}

void print_item(Session &s, const Json &item) {
    if (s.options.json) {
        print_json(item);
        return;
    }
    printf("%s", item["label"].get<std::string>().c_str());
    if (!item["value"].get<std::string>().empty())
        printf(", %s", item["value"].get<std::string>().c_str());
    printf("  (%d of %d)", item["index"].get<int>() + 1, item["last_index"].get<int>() + 1);
    if (!item["hint"].get<std::string>().empty())
        printf("  %s", item["hint"].get<std::string>().c_str());
    printf("\n");
}

// The VoiceOver event's first field is the move: next, previous, into the item, back out.
const std::map<std::string, int> kMoves = {{"next", 0}, {"previous", 1}, {"in", 2}, {"out", 3}};

void move_voiceover(Session &s, const std::string &move) {
    zal_ipod_handle *h = s.with_session();
    s.expect(zal_ipod_voiceover_event_sync(h, kMoves.at(move), 0, 0, 0, 0, 0, ""),
             ("voiceover " + move).c_str());
    print_item(s, voiceover_item(s));
}

void voiceover_parameter(Session &s, int parameter, const std::vector<int> &value) {
    zal_ipod_handle *h = s.with_session();
    if (!value.empty())
        s.expect(zal_ipod_set_voiceover_parameter_sync(h, parameter, value[0]),
                 "voiceover parameter");
    const int32_t now =
        s.expect(zal_ipod_get_voiceover_parameter_sync(h, parameter), "voiceover parameter");
    if (s.options.json)
        print_json(Json{{"parameter", parameter}, {"value", now}});
    else
        printf("voiceover parameter %d = %d\n", parameter, now);
}

// ---- call-state ----

const char *call_status_name(int status) {
    static constexpr const char *kNames[] = {
        "disconnected", "sending", "ringing", "connecting", "active", "held", "disconnecting"};
    return status >= 0 && status < 7 ? kNames[status] : "unknown";
}

void call_state(Session &s, double seconds, int count) {
    int seen = 0;
    s.on_event([&s, &seen](const zal_ipod_event &e) {
        if (zal_ipod_event_type(&e) != ZALIPOD_EVENT_TELEPHONY_CALLSTATE_INFORMATION) return;
        ++seen;
        const int status = zal_ipod_event_telephony_callstate_status(&e);
        const char *remote = zal_ipod_event_telephony_callstate_remote_id(&e);
        const char *name = zal_ipod_event_telephony_callstate_display_name(&e);
        const int direction = zal_ipod_event_telephony_callstate_direction(&e);
        if (s.options.json) {
            print_json(Json{{"status", status},
                            {"status_name", call_status_name(status)},
                            {"remote_id", remote != nullptr ? remote : ""},
                            {"display_name", name != nullptr ? name : ""},
                            {"direction", direction}});
        } else {
            printf("%-13s %s %s%s\n", call_status_name(status), remote != nullptr ? remote : "",
                   name != nullptr ? name : "",
                   direction == 1   ? " (incoming)"
                   : direction == 2 ? " (outgoing)"
                                    : "");
        }
        fflush(stdout);
    });
    zal_ipod_handle *h = s.with_session();
    s.expect(zal_ipod_start_telephony_callstate_information_sync(h, 1), "call-state");
    const auto end = Clock::now() + std::chrono::milliseconds(static_cast<int64_t>(seconds * 1000));
    const bool alive = s.pump_until(end, [&] { return count > 0 && seen >= count; });
    if (alive) zal_ipod_stop_telephony_callstate_information_sync(h);
    if (!alive) throw Failure("call-state: the connection to the daemon was lost");
    if (count > 0 && seen < count)
        throw Failure("call-state: " + std::to_string(seen) + " of " + std::to_string(count) +
                      " call states within " + std::to_string(seconds) + " s");
}

// ---- eap send ----

void send_eap(Session &s, int session_id, const std::string &data, double wait_s) {
    bool answered = false;
    s.on_event([&s, &answered](const zal_ipod_event &e) {
        if (zal_ipod_event_type(&e) != ZALIPOD_EVENT_EAP_DATAGRAM || answered) return;
        answered = true;
        uint32_t length = 0;
        const void *bytes = zal_ipod_event_eap_datagram_data(&e, &length);
        const std::string text =
            bytes != nullptr ? std::string(static_cast<const char *>(bytes), length) : "";
        const int from = zal_ipod_event_eap_datagram_session_id(&e);
        if (s.options.json)
            print_json(Json{{"received", {{"session", from}, {"data", text}}}});
        else
            printf("received %u bytes from session %d: %s\n", length, from, text.c_str());
    });
    zal_ipod_handle *h = s.with_session();
    s.expect(
        zal_ipod_send_eap_datagram_sync(h, session_id, data.data(), static_cast<int>(data.size())),
        "eap send");
    if (s.options.json)
        print_json(Json{{"sent", {{"session", session_id}, {"bytes", data.size()}}}});
    else
        printf("sent %zu bytes to session %d\n", data.size(), session_id);
    fflush(stdout);
    s.pump_until(Clock::now() + std::chrono::milliseconds(static_cast<int64_t>(wait_s * 1000)),
                 [&] { return answered; });
}

}  // namespace

void add_device_info_commands(CLI::App &app, Session &s) {
    on_run(app.add_subcommand("info",
                              "Lingo versions, localization, battery and equaliser of the device"),
           s, [&s] { show_info(s); });

    // Option values live as long as the App (main's scope), as CLI11 requires.
    CLI::App *eq = app.add_subcommand("eq", "List or choose the equaliser profile");
    eq->require_subcommand(1);
    on_run(eq->add_subcommand("list", "List the profiles (* marks the current one)"), s,
           [&s] { list_eq(s); });
    static int eq_index = 0;
    CLI::App *eq_set = eq->add_subcommand("set", "Make profile N the current one");
    eq_set->add_option("N", eq_index, "Profile index")->required();
    on_run(eq_set, s, [&s] { set_eq(s, eq_index); });

    static std::string button;
    CLI::App *button_cmd = app.add_subcommand("button", "Press and release a context button");
    std::vector<std::string> names;
    for (const auto &b : kButtons) names.push_back(b.first);
    button_cmd->add_option("NAME", button, "playpause, volume-up, volume-down, next, previous")
        ->required()
        ->check(CLI::IsMember(names));
    on_run(button_cmd, s, [&s] { press_button(s, button); });

    CLI::App *vo = app.add_subcommand("voiceover", "VoiceOver cursor and parameters");
    vo->require_subcommand(1);
    on_run(vo->add_subcommand("item", "Show the item under the cursor"), s,
           [&s] { print_item(s, voiceover_item(s)); });
    for (const auto &m : kMoves) {
        const std::string move = m.first;
        on_run(vo->add_subcommand(move, "Move the cursor (" + move + ") and show the item"), s,
               [&s, move] { move_voiceover(s, move); });
    }
    static int parameter = 0;
    static std::vector<int> parameter_value;
    CLI::App *vo_param = vo->add_subcommand("parameter", "Show a parameter, or set it to VALUE");
    vo_param->add_option("N", parameter, "0 volume, 1 speaking rate, 2 enabled")->required();
    vo_param->add_option("VALUE", parameter_value, "New value")->expected(0, 1);
    on_run(vo_param, s, [&s] { voiceover_parameter(s, parameter, parameter_value); });

    static double call_seconds = 8.0;
    static int call_count = 0;
    CLI::App *calls = app.add_subcommand("call-state", "Follow the device's call states");
    calls->add_option("-s,--seconds", call_seconds, "How long to listen")
        ->check(CLI::PositiveNumber);
    calls
        ->add_option("-n,--count", call_count,
                     "Stop after this many call states (then 1 if "
                     "fewer came)")
        ->check(CLI::NonNegativeNumber);
    on_run(calls, s, [&s] { call_state(s, call_seconds, call_count); });

    CLI::App *eap = app.add_subcommand("eap", "External accessory datagrams");
    eap->require_subcommand(1);
    static int eap_session = 0;
    static std::string eap_data;
    static double eap_wait = 1.0;
    CLI::App *eap_send = eap->add_subcommand("send", "Send DATA (text) to SESSION");
    eap_send->add_option("SESSION", eap_session, "EAP session id")->required();
    eap_send->add_option("DATA", eap_data, "Bytes to send, as text")->required();
    eap_send->add_option("-w,--wait", eap_wait, "Seconds to wait for an answering datagram")
        ->check(CLI::NonNegativeNumber);
    on_run(eap_send, s, [&s] { send_eap(s, eap_session, eap_data, eap_wait); });
}

}  // namespace zalctl
