// liblog logger hook that stores every record for the tests to inspect.
#include "log_capture.h"

#include <android/log.h>

#include <mutex>

namespace zaltest {
namespace {
std::mutex records_lock;
std::vector<LogRecord> captured;

void capture_logger(const struct __android_logger_data *data, const char *message) {
    std::lock_guard<std::mutex> hold(records_lock);
    captured.push_back({data->priority, data->tag ? data->tag : "", message ? message : ""});
}
}  // namespace

LogCapture::LogCapture() : previous_priority_(__android_log_get_minimum_priority()) {
    clear();
    __android_log_set_logger(capture_logger);
    __android_log_set_minimum_priority(ANDROID_LOG_VERBOSE);
}

LogCapture::~LogCapture() {
    __android_log_set_logger(__android_log_stderr_logger);
    __android_log_set_minimum_priority(previous_priority_);
}

std::vector<LogRecord> LogCapture::records() const {
    std::lock_guard<std::mutex> hold(records_lock);
    return captured;
}

void LogCapture::clear() {
    std::lock_guard<std::mutex> hold(records_lock);
    captured.clear();
}

bool LogCapture::contains(int priority, const std::string &text) const {
    for (const auto &r : records())
        if (r.priority == priority && r.text == text) return true;
    return false;
}

std::vector<std::string> LogCapture::texts(int priority) const {
    std::vector<std::string> out;
    for (const auto &r : records())
        if (r.priority == priority) out.push_back(r.text);
    return out;
}

}  // namespace zaltest
