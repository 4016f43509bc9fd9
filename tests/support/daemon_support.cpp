// Daemon-side test helpers: fake sysfs tree, stdout capture, temporary paths.
#include "daemon_support.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <atomic>
#include <fstream>

#include "common/daemon/context_internal.h"

namespace zaltest {

std::filesystem::path temp_path(const std::string &stem) {
    static std::atomic<int> counter{0};
    return std::filesystem::temp_directory_path() /
           (stem + "-" + std::to_string(getpid()) + "-" + std::to_string(counter++));
}

FakeSysfs::FakeSysfs(const char *address_text, const char *name_text)
    : root_(temp_path("zal-sysfs")) {
    std::filesystem::path hci0 = root_ / "sys/class/bluetooth/hci0";
    std::filesystem::create_directories(hci0);
    if (address_text) std::ofstream(hci0 / "address") << address_text;
    if (name_text) std::ofstream(hci0 / "name") << name_text;
    zal::daemon::set_sysfs_root(root_.c_str());
}

FakeSysfs::~FakeSysfs() {
    zal::daemon::set_sysfs_root(nullptr);
    std::error_code ignored;
    std::filesystem::remove_all(root_, ignored);
}

StdoutCapture::StdoutCapture() {
    fflush(stdout);
    testing::internal::CaptureStdout();
}

StdoutCapture::~StdoutCapture() {
    if (active_) lines();
}

std::vector<std::string> StdoutCapture::lines() {
    active_ = false;
    fflush(stdout);
    return split_lines(testing::internal::GetCapturedStdout());
}

std::vector<std::string> split_lines(const std::string &text) {
    std::vector<std::string> out;
    std::size_t start = 0;
    while (start < text.size()) {
        std::size_t end = text.find('\n', start);
        if (end == std::string::npos) end = text.size();
        out.push_back(text.substr(start, end - start));
        start = end + 1;
    }
    return out;
}

}  // namespace zaltest
