// Helpers for the daemon-side tests: an owned context, a private sysfs tree for the
// Bluetooth reads, and standard output captured as lines.
#pragma once

#include <filesystem>
#include <string>
#include <vector>

#include "zal-ipod-2/daemon.h"

namespace zaltest {

// A zero-filled context whose owned parts are released at the end of the test.
struct OwnedContext {
    context ctx{};
    OwnedContext() = default;
    ~OwnedContext() { zal_context_release(&ctx); }
    OwnedContext(const OwnedContext &) = delete;
    OwnedContext &operator=(const OwnedContext &) = delete;
};

// A temporary directory that stands for "/" in the Bluetooth reads while it lives. Files
// are written under <dir>/sys/class/bluetooth/hci0/ when their text is not null.
class FakeSysfs {
  public:
    FakeSysfs(const char *address_text, const char *name_text);
    ~FakeSysfs();
    FakeSysfs(const FakeSysfs &) = delete;
    FakeSysfs &operator=(const FakeSysfs &) = delete;
    const std::filesystem::path &root() const { return root_; }

  private:
    std::filesystem::path root_;
};

// Standard output written between construction and lines() (which ends the capture),
// split at newlines; a last line without newline is kept.
class StdoutCapture {
  public:
    StdoutCapture();
    ~StdoutCapture();
    StdoutCapture(const StdoutCapture &) = delete;
    StdoutCapture &operator=(const StdoutCapture &) = delete;
    std::vector<std::string> lines();

  private:
    bool active_ = true;
};

std::vector<std::string> split_lines(const std::string &text);

// A unique path under the temporary directory (the file is not created).
std::filesystem::path temp_path(const std::string &stem);

}  // namespace zaltest
