// Runtime configuration keys as SET_CONFIG and GET_CONFIG see them: text values, some keys
// read-only, some with a rule for what they accept, some bound to the daemon context (their
// value is the context's, and writing them goes through its setters).
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <string>

namespace sim {

// Outcomes reported as "config_updated_cfg".
enum ConfigOutcome : int32_t {
    kConfigUpdated = 1,
    kConfigRejected = 0,
    kConfigUnsupported = -1,
    kConfigReadOnly = -10,
};

// "config_val_errorcode" for a key that does not exist.
constexpr int32_t kConfigUnknownKey = -1;

class ConfigStore {
  public:
    using Apply = std::function<bool(const std::string &)>;  // false: the value was refused
    using Read = std::function<std::string()>;

    // A key held by the store itself; adds or replaces.
    void define(const std::string &key, const std::string &value, bool read_only);
    // A key whose value lives elsewhere (apply may be empty for a read-only key).
    void bind(const std::string &key, bool read_only, Apply apply, Read read);

    std::optional<std::string> get(const std::string &key) const;
    ConfigOutcome set(const std::string &key, const std::string &value);
    size_t size() const { return entries_.size(); }

  private:
    struct Entry {
        std::string value;
        bool read_only = false;
        Apply apply;
        Read read;
    };
    std::map<std::string, Entry> entries_;
};

}  // namespace sim
