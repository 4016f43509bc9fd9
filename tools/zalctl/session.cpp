// The connection of one zalctl run: connecting, opening a session on demand, bounded waits,
// and turning failed calls into one-line messages.
#include <fcntl.h>
#include <unistd.h>

#include <cstdio>

#include "zalctl.h"

namespace zalctl {

namespace {

using Clock = std::chrono::steady_clock;

std::string text_of_error(const gval *reply) {
    const gval *e =
        serialize_type(reply) == SERIALIZE_HASH ? serialize_hash_get(reply, "error") : nullptr;
    if (e != nullptr && serialize_type(e) == SERIALIZE_STRING) return serialize_get_string(e);
    return "the daemon answered with an error";
}

// zal_ipod_close announces itself on standard output; keep that out of our output, which
// scripts read (a --json document must stay the only thing there).
void close_quietly(zal_ipod_handle *h) {
    fflush(stdout);
    const int saved = dup(STDOUT_FILENO);
    const int null_fd = open("/dev/null", O_WRONLY | O_CLOEXEC);
    if (saved >= 0 && null_fd >= 0) dup2(null_fd, STDOUT_FILENO);
    zal_ipod_close(h);
    fflush(stdout);
    if (saved >= 0) {
        dup2(saved, STDOUT_FILENO);
        close(saved);
    }
    if (null_fd >= 0) close(null_fd);
}

}  // namespace

Session::~Session() {
    if (h_ == nullptr) return;
    zal_ipod_set_event_cb(h_, nullptr, nullptr);
    close_quietly(h_);
}

zal_ipod_handle *Session::handle() {
    if (h_ != nullptr) return h_;
    // The first connection always goes to the daemon's local socket; the address only
    // serves reconnections (without one the library reads ZALIPODDAEMON).
    h_ = zal_ipod_connect(options.daemon.empty() ? nullptr : options.daemon.c_str());
    if (h_ == nullptr) throw Failure("cannot reach the daemon (is zald-2 or zald-sim running?)");
    zal_ipod_set_read_timeout(h_, options.timeout_s, 0);
    zal_ipod_set_event_cb(h_, &Session::dispatch_event, this);
    return h_;
}

zal_ipod_handle *Session::with_session() {
    zal_ipod_handle *h = handle();
    if (zal_ipod_is_ready(h) == 1 && zal_ipod_current_session(h) == options.device) return h;
    const int count = zal_ipod_device_count(h);
    if (count == 0) throw Failure("no device is attached");
    if (options.device < 0 || options.device >= count)
        throw Failure("no device at index " + std::to_string(options.device) + " (" +
                      std::to_string(count) + " attached)");
    const auto started = Clock::now();
    if (zal_ipod_open_session_sync(h, options.device) != 1) {
        if (Clock::now() - started >= std::chrono::seconds(options.timeout_s))
            fail_without_reply("session open", started);
        throw Failure("session open: the daemon did not open a session on device " +
                      std::to_string(options.device));
    }
    // An iAP1 device takes commands once it entered extended mode, which an event reports.
    const auto deadline = Clock::now() + std::chrono::seconds(options.timeout_s);
    pump_until(deadline, [h] { return zal_ipod_is_ready(h) == 1; });
    if (zal_ipod_is_ready(h) != 1)
        throw Failure("session open: device " + std::to_string(options.device) +
                      " did not become ready within " + std::to_string(options.timeout_s) + " s");
    return h;
}

bool Session::pump_until(Clock::time_point deadline, const std::function<bool()> &done) {
    zal_ipod_handle *h = handle();
    // Deliver what earlier waits queued before deciding anything.
    zal_ipod_pending_event(h);
    while (!(done && done())) {
        if (Clock::now() >= deadline) return true;
        if (zal_ipod_read(h) < 0) return false;
    }
    return true;
}

int32_t Session::expect(int32_t result, const char *what) {
    if (result >= 0) {
        last_error_ = zal_ipod_get_error_message(h_);
        return result;
    }
    // The handle keeps the text of the last reply that carried one: a new text (a new
    // copy) belongs to this command.
    const char *error = zal_ipod_get_error_message(h_);
    if (error != nullptr && error != last_error_) {
        last_error_ = error;
        throw Failure(std::string(what) + ": " + error);
    }
    throw Failure(std::string(what) + ": no answer from the daemon (no reply within " +
                  std::to_string(options.timeout_s) + " s, or the connection was lost)");
}

gval *Session::request(uint16_t opcode, gval *arg, const char *what) {
    zal_ipod_handle *h = handle();
    zal_ipod_send_record record{};
    record.opcode = opcode;
    record.payload = arg;
    const auto started = Clock::now();
    const int sent = zal_ipod_send_packet(h, &record);
    serialize_free(arg);
    if (sent < 0) throw Failure(std::string(what) + ": the connection to the daemon was lost");
    zal_ipod_reply *reply = zal_ipod_wait_for_tid(h, record.tid);
    if (reply == nullptr) fail_without_reply(what, started);
    gval *value = reply->length > 0 ? unserialize(reply->payload, reply->length) : nullptr;
    const bool error = reply->opcode == ZAL_OP_ERROR;
    zal_ipod_reply_free(reply);
    if (error) {
        const std::string text = text_of_error(value);
        serialize_free(value);
        throw Failure(std::string(what) + ": " + text);
    }
    return value;
}

void Session::fail_without_reply(const char *what, Clock::time_point started) {
    // A wait ends early only when the connection went away.
    if (Clock::now() - started < std::chrono::seconds(options.timeout_s))
        throw Failure(std::string(what) + ": the connection to the daemon was lost");
    throw Failure(std::string(what) + ": no reply from the daemon within " +
                  std::to_string(options.timeout_s) + " s");
}

int Session::dispatch_event(zal_ipod_handle *, zal_ipod_event *event, void *user) {
    auto *self = static_cast<Session *>(user);
    // An exception must not cross the library's C frames: a handler that fails (output
    // it cannot write, say) loses that one event.
    try {
        if (self->event_handler_ && event != nullptr) self->event_handler_(*event);
    } catch (...) {
    }
    return 0;
}

void on_run(CLI::App *sub, Session &s, std::function<void()> action) {
    sub->callback([&s, action = std::move(action)] { s.action = action; });
}

}  // namespace zalctl
