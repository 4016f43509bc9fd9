// Captures the records the library writes to liblog, through liblog's own logger hook.
// One capture at a time per process; records from every thread are collected.
#pragma once

#include <string>
#include <vector>

namespace zaltest {

struct LogRecord {
    int priority;
    std::string tag;
    std::string text;
};

class LogCapture {
  public:
    // Installs the hook and lowers liblog's minimum priority to verbose.
    LogCapture();
    // Restores liblog's stderr logger and the previous minimum priority.
    ~LogCapture();
    LogCapture(const LogCapture &) = delete;
    LogCapture &operator=(const LogCapture &) = delete;

    std::vector<LogRecord> records() const;
    void clear();
    // True when a record with this priority and exact text was captured.
    bool contains(int priority, const std::string &text) const;
    // Texts of the records at one priority, in order.
    std::vector<std::string> texts(int priority) const;

  private:
    int previous_priority_;
};

}  // namespace zaltest
