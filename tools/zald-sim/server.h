// The daemon's side of the sockets: listeners (the abstract name, and optionally a TCP port
// on loopback and a socket file), the connected clients with their output queues, timers,
// the request dispatch through the handler table, and fault injection. One thread, one
// poll loop.
#pragma once

#include <cstdint>
#include <deque>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "config_store.h"
#include "handlers.h"
#include "scenario.h"
#include "wire.h"
#include "world.h"

namespace sim {

struct Listen {
    std::string abstract_name;
    std::optional<uint16_t> tcp_port;  // 0: any free port
    std::string socket_path;
};

class Server : public WorldHost {
  public:
    Server(const Scenario &scenario, ConfigStore config, Listen listen);
    ~Server() override;
    Server(const Server &) = delete;
    Server &operator=(const Server &) = delete;

    // Opens the listeners and prints where it listens; false (after a message on stderr)
    // when one cannot be opened.
    bool open();
    // Runs until stop_fd becomes readable (the signal handler writes to it).
    void run(int stop_fd);

    // WorldHost
    void after(Millis delay, std::function<void()> action) override;
    void broadcast(const char *type, int32_t session, const std::string &serial,
                   ValuePtr data) override;
    void device_removed(int32_t device_id) override;

  private:
    struct Chunk {
        std::string bytes;
        Millis not_before = 0;  // later chunks wait behind it, which keeps packets whole
    };
    struct Client {
        int id = 0;
        int fd = -1;
        PacketReader reader;
        std::deque<Chunk> out;
        size_t out_offset = 0;
        bool dead = false;
        ClientSession session;
    };
    struct FaultState {
        FaultRule rule;
        int32_t seen = 0;
        int32_t applied = 0;
    };
    class ServerCall;

    Millis now() const;
    void schedule_scenario(const Scenario &scenario);
    void run_step(const ScriptStep &step);
    void run_timed_fault(const FaultRule &rule);
    void tick();

    void accept_client(int listen_fd);
    void read_client(Client &client);
    void write_client(Client &client);
    void close_client(Client &client, const char *why);
    void handle(Client &client, const Packet &packet);
    const FaultRule *match_fault(uint8_t opcode);
    void deliver(int client_id, std::string packet, const FaultRule *fault);
    void enqueue(Client &client, std::string bytes, Millis not_before = 0);
    Client *client_by_id(int id);
    void flush_held_events();

    World world_;
    ConfigStore config_;
    HandlerTable handlers_;
    Listen listen_;
    std::vector<int> listeners_;
    std::map<int, std::unique_ptr<Client>> clients_;  // by id
    std::multimap<Millis, std::function<void()>> timers_;
    std::vector<FaultState> faults_;
    Millis start_;
    Millis position_interval_ms_;
    Millis last_tick_ = 0;
    int next_client_id_ = 1;
    // Events raised while a request is handled go out after its reply.
    bool holding_events_ = false;
    std::vector<std::string> held_events_;
};

}  // namespace sim
