// What a simulated device offers an accessory beyond playback: lingo versions, localization,
// equaliser profiles, a battery, video out, buttons, VoiceOver with a small item tree, HID
// descriptors and telephony. AccessorySpec is what a scenario sets; AccessoryState is the
// device's running state.
#pragma once

#include <cstdint>
#include <map>
#include <set>
#include <string>
#include <vector>

namespace sim {

// Battery states as GET_POWER_BATTERY_STATE and the "power_battery_state" event report them.
enum BatteryState : int32_t {
    kBatteryDischarging = 1,
    kBatteryCharging = 2,
    kBatteryFull = 3,
};

struct AccessorySpec {
    int32_t battery_level = 80;           // percent
    int64_t battery_interval_ms = 10000;  // one percent per interval
    std::vector<std::string> eq_profiles = {"Off",   "Acoustic", "Bass Booster", "Classical",
                                            "Dance", "Pop",      "Rock"};
    std::vector<std::string> localization = {"en_US", "US"};  // types 0 and 1
};

// One entry of the VoiceOver item tree.
struct VoiceOverItem {
    std::string label;
    std::string value;  // spoken after the label ("" for none)
    std::vector<VoiceOverItem> children;
};

struct AccessoryState {
    // Video out.
    bool video_out = false;
    int32_t video_options = 0;
    int32_t video_delay = 0;
    int32_t state_change = 0;
    // Power: the accessory's offer decides whether the battery charges.
    int32_t available_current = 0;  // mA
    int32_t charging_allowed = 1;
    int32_t battery_level = 80;
    int32_t battery_state = kBatteryDischarging;
    // Input.
    std::map<int32_t, int32_t> buttons;  // opcode -> last mask
    std::vector<int32_t> last_rotation;
    std::set<int32_t> descriptors;  // registered HID descriptor numbers
    // VoiceOver: parameters, context and the cursor (indexes from the root down).
    std::map<int32_t, int32_t> voiceover_parameters;
    int32_t voiceover_context = 0;
    std::vector<size_t> cursor = {0};
    // Audio settings.
    int32_t eq_index = 0;
    int32_t sound_check = 0;
    // Telephony: a new start or a stop makes pending call events of older runs void.
    int32_t call_generation = 0;
    bool telephony_updates = false;
    int32_t location_reports = 0;
    int32_t vehicle_reports = 0;

    void reset(const AccessorySpec &spec);
    // Charging follows the accessory's offer; full at 100.
    int32_t battery_state_now() const;
};

// The VoiceOver tree every simulated device shows (the root's children are the top level).
const VoiceOverItem &voiceover_root();
// Siblings of the item under the cursor, and the item itself (null when the cursor is off).
const std::vector<VoiceOverItem> *voiceover_siblings(const std::vector<size_t> &cursor);
const VoiceOverItem *voiceover_item(const std::vector<size_t> &cursor);

// Lingo versions and options the devices report; null for an unknown lingo.
struct Lingo {
    int32_t number;
    int32_t major;
    int32_t minor;
    uint64_t options;
};
const Lingo *find_lingo(int32_t number);

}  // namespace sim
