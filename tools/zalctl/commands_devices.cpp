// Devices, sessions and keep-alive.
#include <cstdio>

#include "zalctl.h"

namespace zalctl {

namespace {

const char *transport_name(int mode) {
    static constexpr const char *kNames[] = {"usb", "usb_role", "bluetooth", "other"};
    return mode >= 0 && mode < 4 ? kNames[mode] : "unknown";
}

std::string protocol_name(int protocol) {
    if (protocol < 0) return "-";
    return "iAP" + std::to_string(protocol);
}

Json device_json(zal_ipod_handle *h, int i) {
    const char *serial = zal_ipod_device_serial(h, i);
    return Json{{"index", i},
                {"serial", serial != nullptr ? serial : ""},
                {"protocol", zal_ipod_device_protocol(h, i)},
                {"transport", transport_name(zal_ipod_device_transport_mode(h, i))},
                {"authenticated", zal_ipod_device_authenticated(h, i) == 1},
                {"used", zal_ipod_device_used(h, i) == 1},
                {"extended", zal_ipod_device_is_extended(h, i) == 1}};
}

void list_devices(Session &s) {
    zal_ipod_handle *h = s.handle();
    const int count = zal_ipod_device_count(h);
    if (s.options.json) {
        Json list = Json::array();
        for (int i = 0; i < count; ++i) list.push_back(device_json(h, i));
        print_json(Json{{"devices", list}});
        return;
    }
    if (count == 0) {
        printf("no device attached\n");
        return;
    }
    printf("%-5s  %-20s  %-8s  %-9s  %-4s  %-4s  %s\n", "INDEX", "SERIAL", "PROTOCOL", "TRANSPORT",
           "AUTH", "USED", "EXTENDED");
    for (int i = 0; i < count; ++i) {
        const Json d = device_json(h, i);
        printf("%-5d  %-20s  %-8s  %-9s  %-4s  %-4s  %s\n", i,
               d["serial"].get<std::string>().c_str(), protocol_name(d["protocol"]).c_str(),
               d["transport"].get<std::string>().c_str(), d["authenticated"] ? "yes" : "no",
               d["used"] ? "yes" : "no", d["extended"] ? "yes" : "no");
    }
}

// The daemon names the device in an event right after the session reply.
std::string device_name(Session &s, zal_ipod_handle *h) {
    s.pump_until(std::chrono::steady_clock::now() + std::chrono::milliseconds(1000),
                 [h] { return zal_ipod_device_name(h) != nullptr; });
    const char *name = zal_ipod_device_name(h);
    return name != nullptr ? name : "";
}

void open_session(Session &s) {
    zal_ipod_handle *h = s.with_session();
    const int index = zal_ipod_current_session(h);
    const char *serial = zal_ipod_device_serial(h, index);
    const std::string name = device_name(s, h);
    if (s.options.json) {
        print_json(Json{{"session",
                         {{"open", true},
                          {"device", index},
                          {"serial", serial != nullptr ? serial : ""},
                          {"name", name}}}});
        return;
    }
    printf("session open on device %d: %s (%s)\n", index, name.c_str(),
           serial != nullptr ? serial : "?");
}

void close_session(Session &s) {
    zal_ipod_handle *h = s.with_session();
    const int index = zal_ipod_current_session(h);
    const int32_t result = s.expect(zal_ipod_close_session_sync(h), "session close");
    if (result != 1)
        throw Failure("session close: the daemon had no session open on device " +
                      std::to_string(index));
    if (s.options.json)
        print_json(Json{{"session", {{"open", false}, {"device", index}}}});
    else
        printf("session on device %d closed\n", index);
}

void keep_alive(Session &s) {
    const int32_t result = s.expect(zal_ipod_keep_alive_sync(s.handle()), "keepalive");
    if (s.options.json)
        print_json(Json{{"keepalive", result}});
    else
        printf("the daemon answered keep-alive (%d)\n", static_cast<int>(result));
}

}  // namespace

void add_device_commands(CLI::App &app, Session &s) {
    on_run(app.add_subcommand("devices", "List the attached devices"), s,
           [&s] { list_devices(s); });

    CLI::App *session =
        app.add_subcommand("session",
                           "Open or close a session (a session lasts as long as the connection, "
                           "that is this zalctl run)");
    session->require_subcommand(1);
    CLI::App *open = session->add_subcommand("open", "Open a session on device N");
    open->add_option("N", s.options.device, "Device index (see zalctl devices)")
        ->required()
        ->check(CLI::NonNegativeNumber);
    on_run(open, s, [&s] { open_session(s); });
    on_run(
        session->add_subcommand("close",
                                "Open a session on --device and close it again (ends the device's "
                                "extended mode when it was the last session on an iAP1 device)"),
        s, [&s] { close_session(s); });

    on_run(app.add_subcommand("keepalive", "Send a keep-alive and wait for the answer"), s,
           [&s] { keep_alive(s); });
}

}  // namespace zalctl
