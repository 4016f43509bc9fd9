// The scenario zald-sim runs when no -f file is given: an iAP2 phone on USB and an iAP1
// player on Bluetooth, both authenticated, each with a small library; no script, no faults.
#include "scenario.h"

namespace sim {

namespace {

constexpr const char *kDefaultScenario = R"json({
  "name": "default",
  "position_interval_ms": 1000,
  "devices": [
    {
      "serial": "SIMPHONE0001",
      "name": "Sim iPhone",
      "protocol": 2,
      "transport": "usb",
      "bus": 1,
      "address": 4,
      "playing_app": "Music",
      "tracks": [
        {"title": "Morning Drive", "artist": "The Simulators", "album": "Test Patterns", "genre": "Rock", "length_ms": 215000},
        {"title": "Loopback", "artist": "The Simulators", "album": "Test Patterns", "genre": "Rock", "length_ms": 187000},
        {"title": "Null Route", "artist": "Packet Loss", "album": "Timeouts", "genre": "Electronic", "length_ms": 242000},
        {"title": "Keep Alive", "artist": "Packet Loss", "album": "Timeouts", "genre": "Electronic", "length_ms": 199000}
      ],
      "playback": {"state": "paused", "track": 0, "position_ms": 42000}
    },
    {
      "serial": "SIMPOD000002",
      "name": "Sim iPod",
      "protocol": 1,
      "transport": "bluetooth",
      "rfcomm": 3,
      "playing_app": "Music",
      "tracks": [
        {"title": "Clickwheel Waltz", "artist": "Legacy Lingo", "album": "Extended Mode", "genre": "Classical", "length_ms": 301000},
        {"title": "Dock Connector", "artist": "Legacy Lingo", "album": "Extended Mode", "genre": "Classical", "length_ms": 254000},
        {"title": "Thirty Pins", "artist": "Legacy Lingo", "album": "Extended Mode", "genre": "Classical", "length_ms": 178000}
      ],
      "playback": {"state": "stopped", "track": 0}
    }
  ]
})json";

}  // namespace

Scenario default_scenario() {
    return parse_scenario(kDefaultScenario, "<built-in scenario>");
}

}  // namespace sim
