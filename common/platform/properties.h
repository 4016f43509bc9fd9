// System properties. On Android these are libcutils' property_get/property_set; a Linux
// host has no property service, so there the calls use an in-process store that tests
// (and the simulator) can read and write.
#pragma once

#include <cstddef>

// Size of a property value buffer, terminator included (Android's PROPERTY_VALUE_MAX).
constexpr std::size_t kPlatformPropertyValueMax = 92;

// Copies the value of key (or default_value, or "" when that is null) into value, which
// holds kPlatformPropertyValueMax bytes; returns the length copied.
int platform_property_get(const char *key, char *value, const char *default_value);
// Returns 0 on success, negative on failure (null key or value, value too long).
int platform_property_set(const char *key, const char *value);
// Host only: forgets every stored property (tests start from a clean store).
void platform_property_clear();
