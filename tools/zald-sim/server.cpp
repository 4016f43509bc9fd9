// Listeners, clients, timers, request dispatch and fault injection.
#include "server.h"

#include <arpa/inet.h>
#include <cutils/sockets.h>
#include <fcntl.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstring>

#include "sim_log.h"
#include "zal-ipod-2/common.h"
#include "zal-ipod-2/opcodes.h"

namespace sim {

namespace {

constexpr size_t kReadChunk = 65536;
// Stands in for an encoded value: no value starts with this tag byte.
constexpr char kMalformedPayload[] = {'\x00', '\xDE', '\xAD', '\x00'};

bool set_nonblocking(int fd) {
    int flags = fcntl(fd, F_GETFL, 0);
    return flags >= 0 && fcntl(fd, F_SETFL, flags | O_NONBLOCK) == 0 &&
           fcntl(fd, F_SETFD, FD_CLOEXEC) == 0;
}

std::string malformed_packet(uint16_t tid, uint8_t opcode) {
    return encode_header(tid, opcode, sizeof kMalformedPayload) +
           std::string(kMalformedPayload, sizeof kMalformedPayload);
}

int listen_tcp(uint16_t port, uint16_t *bound_port) {
    int fd = socket(AF_INET, SOCK_STREAM, 0);
    if (fd < 0) return -1;
    int one = 1;
    setsockopt(fd, SOL_SOCKET, SO_REUSEADDR, &one, sizeof one);
    sockaddr_in addr{};
    addr.sin_family = AF_INET;
    addr.sin_port = htons(port);
    addr.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t len = sizeof addr;
    if (bind(fd, reinterpret_cast<sockaddr *>(&addr), sizeof addr) != 0 || listen(fd, 16) != 0 ||
        getsockname(fd, reinterpret_cast<sockaddr *>(&addr), &len) != 0) {
        int saved = errno;
        close(fd);
        errno = saved;
        return -1;
    }
    *bound_port = ntohs(addr.sin_port);
    return fd;
}

int listen_path(const std::string &path) {
    sockaddr_un addr{};
    if (path.size() >= sizeof addr.sun_path) {
        errno = ENAMETOOLONG;
        return -1;
    }
    // A socket file left behind by an earlier run is replaced; any other file is not touched.
    struct stat st {};
    if (lstat(path.c_str(), &st) == 0 && S_ISSOCK(st.st_mode)) unlink(path.c_str());
    int fd = socket(AF_UNIX, SOCK_STREAM, 0);
    if (fd < 0) return -1;
    addr.sun_family = AF_UNIX;
    memcpy(addr.sun_path, path.c_str(), path.size() + 1);
    if (bind(fd, reinterpret_cast<sockaddr *>(&addr), sizeof addr) != 0 || listen(fd, 16) != 0) {
        int saved = errno;
        close(fd);
        errno = saved;
        return -1;
    }
    return fd;
}

}  // namespace

// A request's answer path: the reply goes through the fault chosen for the request.
class Server::ServerCall : public Call {
  public:
    ServerCall(Server &server, Client &client, const Packet &packet, const gval *arg,
               const FaultRule *fault)
        : Call(server.world_, server.config_, client.session, packet.tid, packet.opcode, arg),
          server_(server),
          client_id_(client.id),
          fault_(fault) {}

    void reply(ValuePtr value) override { send(encode_packet(tid, ZAL_OP_RETURN, value.get())); }
    void fail(const std::string &text) override {
        SIM_LOGW("zald-sim: %s (tid %u): %s\n", get_function_string(opcode), tid, text.c_str());
        send(encode_packet(tid, ZAL_OP_ERROR, HashBuilder().add("error", text).take().get()));
    }
    bool answered() const { return answered_; }

  private:
    void send(std::string packet) {
        if (answered_) return;  // one answer per request
        answered_ = true;
        server_.deliver(client_id_, std::move(packet), fault_);
    }

    Server &server_;
    int client_id_;
    const FaultRule *fault_;
    bool answered_ = false;
};

Server::Server(const Scenario &scenario, ConfigStore config, Listen listen)
    : world_(scenario.devices, *this),
      config_(std::move(config)),
      handlers_(make_handler_table()),
      listen_(std::move(listen)),
      start_(0),
      position_interval_ms_(scenario.position_interval_ms) {
    start_ = now();
    last_tick_ = start_;
    for (const FaultRule &rule : scenario.faults) faults_.push_back(FaultState{rule, 0, 0});
    schedule_scenario(scenario);
    world_.start();
}

Server::~Server() {
    for (auto &[id, client] : clients_) close(client->fd);
    for (int fd : listeners_) close(fd);
    if (!listen_.socket_path.empty()) unlink(listen_.socket_path.c_str());
}

Millis Server::now() const {
    using namespace std::chrono;
    return duration_cast<milliseconds>(steady_clock::now().time_since_epoch()).count();
}

bool Server::open() {
    int fd = socket_local_server(listen_.abstract_name.c_str(), ANDROID_SOCKET_NAMESPACE_ABSTRACT,
                                 SOCK_STREAM);
    if (fd < 0 || !set_nonblocking(fd)) {
        fprintf(stderr, "zald-sim: cannot listen on abstract socket \"%s\": %s\n",
                listen_.abstract_name.c_str(), strerror(errno));
        return false;
    }
    listeners_.push_back(fd);
    printf("zald-sim: listening on abstract socket %s\n", listen_.abstract_name.c_str());
    if (listen_.tcp_port) {
        uint16_t bound = 0;
        fd = listen_tcp(*listen_.tcp_port, &bound);
        if (fd < 0 || !set_nonblocking(fd)) {
            fprintf(stderr, "zald-sim: cannot listen on TCP port %u of 127.0.0.1: %s\n",
                    *listen_.tcp_port, strerror(errno));
            return false;
        }
        listeners_.push_back(fd);
        printf("zald-sim: listening on tcp 127.0.0.1:%u\n", bound);
    }
    if (!listen_.socket_path.empty()) {
        fd = listen_path(listen_.socket_path);
        if (fd < 0 || !set_nonblocking(fd)) {
            fprintf(stderr, "zald-sim: cannot listen on socket file %s: %s\n",
                    listen_.socket_path.c_str(), strerror(errno));
            listen_.socket_path.clear();  // not ours to remove
            return false;
        }
        listeners_.push_back(fd);
        printf("zald-sim: listening on path %s\n", listen_.socket_path.c_str());
    }
    fflush(stdout);
    return true;
}

void Server::after(Millis delay, std::function<void()> action) {
    timers_.emplace(now() + std::max<Millis>(delay, 0), std::move(action));
}

void Server::schedule_scenario(const Scenario &scenario) {
    for (const ScriptStep &step : scenario.script)
        timers_.emplace(start_ + step.at_ms, [this, step] { run_step(step); });
    for (const FaultRule &rule : scenario.faults)
        if (rule.at_ms)
            timers_.emplace(start_ + *rule.at_ms, [this, rule] { run_timed_fault(rule); });
    timers_.emplace(start_ + position_interval_ms_, [this] { tick(); });
}

void Server::tick() {
    const Millis t = now();
    world_.tick(t - last_tick_);
    last_tick_ = t;
    after(position_interval_ms_, [this] { tick(); });
}

void Server::run_step(const ScriptStep &step) {
    Device *d = step.device.empty() ? nullptr : world_.find(step.device);
    switch (step.action) {
        case StepAction::kAttach:
            if (!world_.attach(step.device))
                SIM_LOGW("zald-sim: script: %s is already attached\n", step.device.c_str());
            return;
        case StepAction::kDetach:
            if (!world_.detach(step.device))
                SIM_LOGW("zald-sim: script: %s is not attached\n", step.device.c_str());
            return;
        case StepAction::kEvent:
            broadcast(step.event.c_str(), d ? d->id : 0, d ? d->spec.serial : std::string(),
                      step.data ? ValuePtr(serialize_dup(step.data.get())) : ValuePtr());
            return;
        default:
            break;
    }
    if (d == nullptr || !d->present) {
        SIM_LOGW("zald-sim: script: %s is not attached\n", step.device.c_str());
        return;
    }
    switch (step.action) {
        case StepAction::kPlay:
            world_.play(*d);
            break;
        case StepAction::kPause:
            world_.pause(*d);
            break;
        case StepAction::kPlayPause:
            world_.play_pause(*d);
            break;
        case StepAction::kStop:
            world_.stop(*d);
            break;
        case StepAction::kNext:
            world_.next_track(*d);
            break;
        case StepAction::kPrevious:
            world_.previous_track(*d);
            break;
        default:
            break;
    }
}

void Server::run_timed_fault(const FaultRule &rule) {
    for (auto &[id, client] : clients_) {
        if (client->dead) continue;
        if (rule.action == FaultAction::kDrop) {
            close_client(*client, "timed fault");
        } else {
            enqueue(*client, malformed_packet(0, ZAL_OP_EVENT));
        }
    }
}

void Server::broadcast(const char *type, int32_t session, const std::string &serial,
                       ValuePtr data) {
    HashBuilder event;
    event.add("event", std::string(type)).add("session", session);
    if (!serial.empty()) event.add("serial", serial);
    if (data) event.add("data", data.release());
    std::string packet = encode_packet(0, ZAL_OP_EVENT, event.take().get());
    SIM_LOGD("zald-sim: event %s (%s)\n", type, serial.c_str());
    if (holding_events_) {
        held_events_.push_back(std::move(packet));
        return;
    }
    for (auto &[id, client] : clients_)
        if (!client->dead) enqueue(*client, packet);
}

void Server::flush_held_events() {
    holding_events_ = false;
    std::vector<std::string> events;
    events.swap(held_events_);
    for (const std::string &packet : events)
        for (auto &[id, client] : clients_)
            if (!client->dead) enqueue(*client, packet);
}

void Server::device_removed(int32_t device_id) {
    for (auto &[id, client] : clients_)
        if (client->session.device_id == device_id) client->session.device_id = 0;
}

Server::Client *Server::client_by_id(int id) {
    auto it = clients_.find(id);
    return it == clients_.end() || it->second->dead ? nullptr : it->second.get();
}

void Server::enqueue(Client &client, std::string bytes, Millis not_before) {
    client.out.push_back(Chunk{std::move(bytes), not_before});
    write_client(client);
}

void Server::deliver(int client_id, std::string packet, const FaultRule *fault) {
    Client *client = client_by_id(client_id);
    if (client == nullptr) return;
    if (fault == nullptr) return enqueue(*client, std::move(packet));
    switch (fault->action) {
        case FaultAction::kDelay:
            after(fault->delay_ms, [this, client_id, p = std::move(packet)]() mutable {
                if (Client *c = client_by_id(client_id)) enqueue(*c, std::move(p));
            });
            return;
        case FaultAction::kSplit: {
            const size_t cut = std::min(fault->split_at, packet.size());
            std::string rest = packet.substr(cut);
            packet.resize(cut);
            enqueue(*client, std::move(packet));
            if (!rest.empty()) enqueue(*client, std::move(rest), now() + fault->split_gap_ms);
            return;
        }
        case FaultAction::kMalformed: {
            const auto *head = reinterpret_cast<const unsigned char *>(packet.data());
            const auto tid = static_cast<uint16_t>((head[2] << 8) | head[3]);
            return enqueue(*client, malformed_packet(tid, head[4]));
        }
        default:
            return enqueue(*client, std::move(packet));
    }
}

const FaultRule *Server::match_fault(uint8_t opcode) {
    const Millis elapsed = now() - start_;
    for (FaultState &f : faults_) {
        const FaultRule &r = f.rule;
        if (r.at_ms) continue;
        if (r.opcode >= 0 && r.opcode != opcode) continue;
        if (elapsed < r.from_ms || (r.until_ms >= 0 && elapsed >= r.until_ms)) continue;
        if (f.seen++ < r.skip) continue;
        if (r.count >= 0 && f.applied >= r.count) continue;
        ++f.applied;
        return &r;
    }
    return nullptr;
}

void Server::handle(Client &client, const Packet &packet) {
    const char *name = get_function_string(packet.opcode);
    SIM_LOGD("zald-sim: client %d: %s (opcode %u, tid %u, %zu payload bytes)\n", client.id, name,
             packet.opcode, packet.tid, packet.payload.size());
    const FaultRule *fault = match_fault(packet.opcode);
    if (fault != nullptr) {
        switch (fault->action) {
            case FaultAction::kError:
                SIM_LOGI("zald-sim: fault: ERROR for %s (tid %u)\n", name, packet.tid);
                return enqueue(
                    client, encode_packet(packet.tid, ZAL_OP_ERROR,
                                          HashBuilder().add("error", fault->message).take().get()));
            case FaultAction::kNoReply:
                SIM_LOGI("zald-sim: fault: no reply to %s (tid %u)\n", name, packet.tid);
                return;
            case FaultAction::kDrop:
                return close_client(client, "fault: connection dropped");
            default:
                SIM_LOGI("zald-sim: fault: reply to %s (tid %u) will be altered\n", name,
                         packet.tid);
                break;
        }
    }
    ValuePtr arg;
    if (!packet.payload.empty()) {
        arg.reset(unserialize(reinterpret_cast<const unsigned char *>(packet.payload.data()),
                              static_cast<uint32_t>(packet.payload.size())));
    }
    ServerCall call(*this, client, packet, arg.get(), fault);
    Handler handler = handlers_[packet.opcode];
    holding_events_ = true;
    if (!packet.payload.empty() && arg == nullptr) {
        call.fail("the payload of " + std::string(name) + " is not a value");
    } else if (handler == nullptr) {
        call.fail("zald-sim does not serve opcode " + std::to_string(packet.opcode) + " (" + name +
                  ")");
    } else {
        handler(call);
        if (!call.answered()) call.fail("internal error: the request was not answered");
    }
    flush_held_events();
}

void Server::accept_client(int listen_fd) {
    for (;;) {
        int fd = accept(listen_fd, nullptr, nullptr);
        if (fd < 0) {
            if (errno != EAGAIN && errno != EWOULDBLOCK && errno != EINTR)
                SIM_LOGE("zald-sim: accept failed: %s\n", strerror(errno));
            return;
        }
        if (!set_nonblocking(fd)) {
            close(fd);
            continue;
        }
        auto client = std::make_unique<Client>();
        client->id = next_client_id_++;
        client->fd = fd;
        SIM_LOGI("zald-sim: client %d connected\n", client->id);
        clients_.emplace(client->id, std::move(client));
    }
}

void Server::read_client(Client &client) {
    char buffer[kReadChunk];
    ssize_t n = read(client.fd, buffer, sizeof buffer);
    if (n == 0) return close_client(client, "closed by the client");
    if (n < 0) {
        if (errno == EAGAIN || errno == EWOULDBLOCK || errno == EINTR) return;
        return close_client(client, strerror(errno));
    }
    client.reader.feed(buffer, static_cast<size_t>(n));
    while (!client.dead) {
        auto packet = client.reader.next();
        if (!packet) break;
        handle(client, *packet);
    }
    if (client.reader.broken()) close_client(client, "a header announced an oversized payload");
}

void Server::write_client(Client &client) {
    const Millis t = now();
    while (!client.dead && !client.out.empty()) {
        Chunk &chunk = client.out.front();
        if (chunk.not_before > t) return;
        ssize_t n = send(client.fd, chunk.bytes.data() + client.out_offset,
                         chunk.bytes.size() - client.out_offset, MSG_NOSIGNAL);
        if (n < 0) {
            if (errno == EAGAIN || errno == EWOULDBLOCK || errno == EINTR) return;
            return close_client(client, strerror(errno));
        }
        client.out_offset += static_cast<size_t>(n);
        if (client.out_offset == chunk.bytes.size()) {
            client.out.pop_front();
            client.out_offset = 0;
        }
    }
}

void Server::close_client(Client &client, const char *why) {
    if (client.dead) return;
    SIM_LOGI("zald-sim: client %d disconnected (%s)\n", client.id, why);
    client.dead = true;
    close(client.fd);
    client.fd = -1;
    client.out.clear();
    if (Device *d = world_.by_id(client.session.device_id); d != nullptr && d->present) {
        world_.leave_session(*d);
        world_.settle_session(*d);
    }
    client.session.device_id = 0;
}

void Server::run(int stop_fd) {
    printf("zald-sim: ready\n");
    fflush(stdout);
    std::vector<pollfd> fds;
    std::vector<int> ids;
    for (;;) {
        // Due timers; a timer may add timers, so take them one at a time.
        while (!timers_.empty() && timers_.begin()->first <= now()) {
            auto action = std::move(timers_.begin()->second);
            timers_.erase(timers_.begin());
            action();
        }
        for (auto it = clients_.begin(); it != clients_.end();) {
            if (!it->second->dead) write_client(*it->second);
            it = it->second->dead ? clients_.erase(it) : std::next(it);
        }

        const Millis t = now();
        Millis wait = 1000;
        if (!timers_.empty()) wait = std::min(wait, timers_.begin()->first - t);
        fds.clear();
        ids.clear();
        fds.push_back(pollfd{stop_fd, POLLIN, 0});
        for (int fd : listeners_) fds.push_back(pollfd{fd, POLLIN, 0});
        for (auto &[id, client] : clients_) {
            short events = POLLIN;
            if (!client->out.empty()) {
                if (client->out.front().not_before <= t)
                    events |= POLLOUT;
                else
                    wait = std::min(wait, client->out.front().not_before - t);
            }
            fds.push_back(pollfd{client->fd, events, 0});
            ids.push_back(id);
        }
        int ready = poll(fds.data(), fds.size(), static_cast<int>(std::max<Millis>(wait, 0)));
        if (ready < 0) {
            if (errno == EINTR) continue;
            SIM_LOGE("zald-sim: poll failed: %s\n", strerror(errno));
            return;
        }
        if (fds[0].revents != 0) return;
        for (size_t i = 0; i < listeners_.size(); ++i)
            if (fds[1 + i].revents & POLLIN) accept_client(listeners_[i]);
        for (size_t i = 0; i < ids.size(); ++i) {
            const short revents = fds[1 + listeners_.size() + i].revents;
            Client *client = client_by_id(ids[i]);
            if (client == nullptr || revents == 0) continue;
            if (revents & (POLLIN | POLLHUP | POLLERR)) read_client(*client);
            if (!client->dead && (revents & POLLOUT)) write_client(*client);
        }
    }
}

}  // namespace sim
