// Internals of the daemon context shared by its units: text copies into fixed fields,
// decimal parsing, and the sysfs root that the Bluetooth reads use.
#pragma once

#include <cstddef>
#include <cstdint>

namespace zal::daemon {

// Copies src into dst of capacity bytes, cutting it to capacity - 1 characters.
void copy_cut(char *dst, std::size_t capacity, const char *src);

// atoi() without its undefined overflow: leading blanks, optional sign, digits; anything
// else ends the number; no digits give 0; values beyond int32 are clamped.
int32_t parse_decimal(const char *text);

// Tests point the Bluetooth reads at a directory of their own; the default (and null) is
// the real root, so the daemon reads "/sys/class/bluetooth/hci0/...".
void set_sysfs_root(const char *root);
// Writes root + absolute_path into out; false when it does not fit.
bool sysfs_path(const char *absolute_path, char *out, std::size_t size);

}  // namespace zal::daemon
