// Scenarios: the devices, media libraries and players of a run, extra listeners, extra
// configuration keys, a timed script and fault injection, read from JSON. The reference of
// the format is README.md beside this file.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "world.h"

namespace sim {

using SharedValue = std::shared_ptr<gval>;

enum class StepAction {
    kAttach,  // "connect"
    kDetach,  // "disconnect"
    kEvent,   // "event": any event type with any data
    kPlay,
    kPause,
    kPlayPause,
    kStop,
    kNext,
    kPrevious,
};

struct ScriptStep {
    Millis at_ms = 0;
    StepAction action = StepAction::kEvent;
    std::string device;  // serial; empty for events that concern no device
    std::string event;
    SharedValue data;  // null: the event carries no "data"
};

enum class FaultAction { kDelay, kError, kNoReply, kDrop, kSplit, kMalformed };

struct FaultRule {
    // Request faults: applied to the replies of matching requests.
    int32_t opcode = -1;   // -1: any opcode
    Millis from_ms = 0;    // window, in milliseconds since the start
    Millis until_ms = -1;  // -1: open-ended
    int32_t skip = 0;      // matching requests to let through first
    int32_t count = -1;    // how many times to apply; -1: always
    // Timed faults: applied once to every connected client at at_ms.
    std::optional<Millis> at_ms;

    FaultAction action = FaultAction::kError;
    Millis delay_ms = 500;                   // kDelay
    std::string message = "injected fault";  // kError
    size_t split_at = 6;                     // kSplit: bytes in the first part
    Millis split_gap_ms = 100;               // kSplit: pause before the rest
};

struct ConfigSeed {
    std::string key;
    std::string value;
    bool read_only = false;
};

struct Scenario {
    std::string name = "default";
    std::optional<uint16_t> tcp_port;  // 0: any free port
    std::string socket_path;           // empty: none
    Millis position_interval_ms = 1000;
    std::vector<DeviceSpec> devices;
    std::vector<ConfigSeed> config;
    std::vector<ScriptStep> script;
    std::vector<FaultRule> faults;
};

// A scenario that cannot be used; what() names the origin, the place and the problem.
class ScenarioError : public std::runtime_error {
  public:
    using std::runtime_error::runtime_error;
};

Scenario parse_scenario(const std::string &text, const std::string &origin);
Scenario load_scenario_file(const std::string &path);
Scenario default_scenario();

// Opcode by number text or by name (as get_function_string spells it); -1 when unknown.
int32_t opcode_by_name(const std::string &name);

}  // namespace sim
