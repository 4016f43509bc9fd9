// Key store with the acceptance rules of the keys that mirror the daemon's context.
#include "config_store.h"

#include <cstdlib>

namespace sim {

namespace {

constexpr size_t kMaxValueLength = 255;  // the context's text fields hold 256 bytes

bool is_integer(const std::string &text) {
    if (text.empty()) return false;
    char *end = nullptr;
    strtol(text.c_str(), &end, 10);
    return *end == '\0';
}

// Shapes checked before a value reaches the context, whose setters are more forgiving
// (a protocol mode of "x" would be stored as 1 there).
bool acceptable(const std::string &key, const std::string &value) {
    if (value.size() > kMaxValueLength) return false;
    if (key == "app_match_team_id") return value.empty() || value.size() == 10;
    if (key == "highest_protocol_mode") return is_integer(value) && atoi(value.c_str()) >= 1;
    if (key == "vehicle_information_component_engine_type") return is_integer(value);
    return true;
}

}  // namespace

void ConfigStore::define(const std::string &key, const std::string &value, bool read_only) {
    entries_[key] = Entry{value, read_only, nullptr, nullptr};
}

void ConfigStore::bind(const std::string &key, bool read_only, Apply apply, Read read) {
    entries_[key] = Entry{std::string(), read_only, std::move(apply), std::move(read)};
}

std::optional<std::string> ConfigStore::get(const std::string &key) const {
    auto it = entries_.find(key);
    if (it == entries_.end()) return std::nullopt;
    return it->second.read ? it->second.read() : it->second.value;
}

ConfigOutcome ConfigStore::set(const std::string &key, const std::string &value) {
    auto it = entries_.find(key);
    if (it == entries_.end()) return kConfigUnsupported;
    Entry &entry = it->second;
    if (entry.read_only) return kConfigReadOnly;
    if (!acceptable(key, value)) return kConfigRejected;
    if (entry.apply) return entry.apply(value) ? kConfigUpdated : kConfigRejected;
    entry.value = value;
    return kConfigUpdated;
}

}  // namespace sim
