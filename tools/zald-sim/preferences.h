// Device preferences: the classes a device knows, the values each accepts, and the values a
// device starts with.
#pragma once

#include <cstdint>
#include <map>

namespace sim {

bool preference_valid(int32_t preference_class, int32_t value);
bool preference_class_known(int32_t preference_class);
std::map<int32_t, int32_t> default_preferences();

}  // namespace sim
