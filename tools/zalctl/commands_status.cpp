// status: the device, the session and the now-playing block (the track position as a bar).
#include <cstdio>

#include "zalctl.h"

namespace zalctl {

namespace {

void show_status(Session &s) {
    zal_ipod_handle *h = s.with_session();
    const int index = zal_ipod_current_session(h);
    const char *serial = zal_ipod_device_serial(h, index);
    const Json np = now_playing(s);  // its reply follows the device-name event
    const char *name = zal_ipod_device_name(h);
    const Json device{{"index", index},
                      {"serial", serial != nullptr ? serial : ""},
                      {"name", name != nullptr ? name : ""},
                      {"protocol", zal_ipod_device_protocol(h, index)}};
    if (s.options.json) {
        print_json(Json{
            {"device", device},
            {"session",
             {{"open", zal_ipod_is_session_opened(h) == 1}, {"ready", zal_ipod_is_ready(h) == 1}}},
            {"now_playing", np}});
        return;
    }
    printf("device:   %d  %s (%s, iAP%d)\n", index, device["name"].get<std::string>().c_str(),
           device["serial"].get<std::string>().c_str(), device["protocol"].get<int>());
    printf("session:  %s\n", zal_ipod_is_ready(h) == 1 ? "open, ready" : "open, not ready");
    fputs(now_playing_block(np).c_str(), stdout);
}

}  // namespace

void add_status_commands(CLI::App &app, Session &s) {
    on_run(app.add_subcommand("status", "Show the device, the session and what is playing"), s,
           [&s] { show_status(s); });
}

}  // namespace zalctl
