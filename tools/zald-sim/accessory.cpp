// Accessory-facing state of the simulated devices: the fixed tables (lingos, VoiceOver tree),
// the reset from the scenario and the battery clock.
#include "accessory.h"

#include "sim_log.h"
#include "world.h"

namespace sim {

namespace {

// Charging needs the current of a USB port at least.
constexpr int32_t kChargingCurrentMa = 500;

const Lingo kLingos[] = {
    {0x00, 1, 9, 0x0000000000000f37ull},   // general
    {0x02, 1, 4, 0x0000000000000001ull},   // simple remote
    {0x03, 1, 5, 0x0000000000000003ull},   // display remote
    {0x04, 1, 14, 0x0000000000000107ull},  // extended interface
    {0x0a, 1, 2, 0x0000000000000000ull},   // digital audio
};

}  // namespace

void AccessoryState::reset(const AccessorySpec &spec) {
    *this = AccessoryState();
    battery_level = spec.battery_level;
    battery_state = battery_state_now();
    voiceover_parameters = {{0, 50}, {1, 50}, {2, 1}};  // volume, speaking rate, enabled
}

int32_t AccessoryState::battery_state_now() const {
    const bool powered = available_current >= kChargingCurrentMa && charging_allowed != 0;
    if (!powered) return kBatteryDischarging;
    return battery_level >= 100 ? kBatteryFull : kBatteryCharging;
}

const VoiceOverItem &voiceover_root() {
    static const VoiceOverItem root{
        "Home",
        "",
        {
            {"Music", "", {{"Artists", "", {}}, {"Albums", "", {}}, {"Songs", "", {}}}},
            {"Podcasts", "", {{"Subscriptions", "", {}}, {"Downloads", "", {}}}},
            {"Settings", "", {{"Volume", "50 percent", {}}, {"Speaking Rate", "Normal", {}}}},
        }};
    return root;
}

const std::vector<VoiceOverItem> *voiceover_siblings(const std::vector<size_t> &cursor) {
    const VoiceOverItem *parent = &voiceover_root();
    for (size_t depth = 0; depth + 1 < cursor.size(); ++depth) {
        if (cursor[depth] >= parent->children.size()) return nullptr;
        parent = &parent->children[cursor[depth]];
    }
    return &parent->children;
}

const VoiceOverItem *voiceover_item(const std::vector<size_t> &cursor) {
    const std::vector<VoiceOverItem> *siblings = voiceover_siblings(cursor);
    if (siblings == nullptr || cursor.empty() || cursor.back() >= siblings->size()) return nullptr;
    return &(*siblings)[cursor.back()];
}

const Lingo *find_lingo(int32_t number) {
    for (const Lingo &l : kLingos)
        if (l.number == number) return &l;
    return nullptr;
}

// One step of a device's battery: down a percent while nothing charges it, up while the
// accessory offers enough current; an event whenever level or state changed.
void World::run_battery(Device &device) {
    const int32_t id = device.id;
    after(device.spec.accessory.battery_interval_ms, [this, id] {
        Device *d = by_id(id);
        if (d == nullptr) return;
        if (d->present) step_battery(*d);
        run_battery(*d);
    });
}

void World::step_battery(Device &d) {
    AccessoryState &a = d.accessory;
    const int32_t before_level = a.battery_level, before_state = a.battery_state;
    if (a.battery_state_now() == kBatteryDischarging) {
        if (a.battery_level > 0) --a.battery_level;
    } else if (a.battery_level < 100) {
        ++a.battery_level;
    }
    a.battery_state = a.battery_state_now();
    if (a.battery_level != before_level || a.battery_state != before_state) announce_battery(d);
}

void World::announce_battery(Device &d) {
    d.accessory.battery_state = d.accessory.battery_state_now();
    SIM_LOGD("zald-sim: device %s battery %d%% state %d\n", d.spec.serial.c_str(),
             d.accessory.battery_level, d.accessory.battery_state);
    emit(d, "power_battery_state",
         HashBuilder()
             .add("state", d.accessory.battery_state)
             .add("level", d.accessory.battery_level)
             .take());
}

}  // namespace sim
