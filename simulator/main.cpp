// ipmisel-simulator: BMCs of simulated servers behind UDP ports of 127.0.0.1. User root, password
// secret.

#include <poll.h>
#include <sys/resource.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <chrono>
#include <csignal>
#include <cstdio>
#include <ctime>
#include <exception>
#include <iostream>
#include <memory>
#include <optional>
#include <random>
#include <ratio>
#include <string>
#include <utility>
#include <vector>

#include "simulator/bmc_port.h"
#include "simulator/server_file.h"

namespace {

using ipmisim::BmcPort;
using ipmisim::Packet;

constexpr unsigned kLongestLog = 65534;  // record IDs 1 to FFFEh

constexpr int kExitFailed = 1, kExitUsage = 2;

volatile std::sig_atomic_t gEnded = 0;

struct Options {
    std::string server;
    std::optional<unsigned> records;
    unsigned controllers = 1;
    unsigned silent = 0;
    unsigned port = 6230;
    unsigned suite = 17;
    double delay = 0;
    double loss = 0;
    unsigned seed = 1;
    double latency = 0;
};

/// A number in this range, of which the help has no more to say.
template <typename Number>
CLI::Validator Between(Number min, Number max) {
    return CLI::Range(min, max).description("");
}

/// A log of so many power supply events, one a second.
std::vector<std::array<std::uint8_t, 16>> MakeLog(unsigned records) {
    constexpr std::uint32_t kFirst = 1709640000;
    std::vector<std::array<std::uint8_t, 16>> log;
    for (std::uint32_t i = 1; i <= records; ++i) {
        const std::uint32_t time = kFirst + i;
        log.push_back({static_cast<std::uint8_t>(i), static_cast<std::uint8_t>(i >> 8), 0x02,
                       static_cast<std::uint8_t>(time), static_cast<std::uint8_t>(time >> 8),
                       static_cast<std::uint8_t>(time >> 16), static_cast<std::uint8_t>(time >> 24),
                       0x20, 0x00, 0x04, 0x08, 0x51, 0x6F, static_cast<std::uint8_t>(i % 4), 0xFF,
                       0xFF});
    }
    return log;
}

std::vector<std::unique_ptr<BmcPort>> MakePorts(const Options& options) {
    std::vector<ipmisim::BmcDescription> bmcs(1);
    if (!options.server.empty()) bmcs = ipmisim::ReadServerFile(options.server).bmcs;
    if (bmcs.empty()) throw std::runtime_error(options.server + ": describes no BMC");
    ipmisim::Service service;
    using Duration = ipmisim::Service::Duration;
    const Duration delay(static_cast<int>(options.delay * 1000));
    service.perRequest = Duration(static_cast<int>(options.latency * 1000));
    service.oneAtATime = true;
    if (options.delay > 0) service.roundTrip = [delay](unsigned) { return delay; };
    const auto random = std::make_shared<std::mt19937>(options.seed);
    const auto isLost = [random, share = options.loss / 100] {
        return std::uniform_real_distribution<>(0, 1)(*random) < share;
    };
    std::vector<std::unique_ptr<BmcPort>> ports;
    for (unsigned i = 0; i < options.controllers; ++i) {
        ipmisim::BmcDescription bmc = bmcs[i % bmcs.size()];
        if (options.records) bmc.selEntries = MakeLog(*options.records);
        const auto number = static_cast<std::uint16_t>(options.port == 0 ? 0 : options.port + i);
        ports.push_back(std::make_unique<BmcPort>(
            std::move(bmc),
            ipmisim::RmcpBmc::Options{.cipherSuite = static_cast<int>(options.suite)}, number,
            service));
        const bool isSilent = i >= options.controllers - options.silent;
        if (isSilent) {
            ports.back()->SetHooks([](std::vector<Packet>* packets) { packets->clear(); }, {});
        } else if (options.loss > 0) {
            ports.back()->SetHooks(
                [isLost](std::vector<Packet>* packets) {
                    std::erase_if(*packets, [&](const Packet&) { return isLost(); });
                },
                [isLost](const Packet& packet) {
                    return std::vector<Packet>(isLost() ? 0 : 1, packet);
                });
        }
    }
    return ports;
}

void Serve(const std::vector<std::unique_ptr<BmcPort>>& ports) {
    std::vector<pollfd> waits;
    waits.reserve(ports.size());
    for (const auto& port : ports) waits.push_back({port->Descriptor(), POLLIN, 0});
    while (gEnded == 0) {
        const auto now = BmcPort::Clock::now();
        auto due = now + std::chrono::seconds(1);
        for (const auto& port : ports) due = std::min(due, port->NextDue());
        const auto rest =
            std::max(std::chrono::nanoseconds(due - now), std::chrono::nanoseconds(0));
        constexpr auto kSecond = std::nano::den;
        const timespec wait{static_cast<std::time_t>(rest.count() / kSecond),
                            static_cast<long>(rest.count() % kSecond)};
        ppoll(waits.data(), waits.size(), &wait, nullptr);
        for (std::size_t i = 0; i < ports.size(); ++i) {
            if (waits[i].revents != 0 || ports[i]->NextDue() <= BmcPort::Clock::now()) {
                ports[i]->Serve();
            }
        }
    }
}

}  // namespace

int main(int argc, char** argv) {
    Options options;
    CLI::App app(
        "Management controllers (BMC) of a simulated server behind UDP ports of 127.0.0.1, which "
        "speak IPMI "
        "2.0 (RMCP+): user root, password secret.",
        "ipmisel-simulator");
    app.add_option("--server", options.server,
                   "The file that describes the server; without it a BMC has an empty log and "
                   "nothing else")
        ->type_name("FILE");
    app.add_option("--records", options.records,
                   "A made-up log of N records instead of the server's")
        ->type_name("N")
        ->check(Between(0U, kLongestLog));
    app.add_option("--controllers", options.controllers, "How many BMCs, one per port")
        ->type_name("N")
        ->check(Between(1U, 60000U))
        ->capture_default_str();
    app.add_option("--port", options.port, "UDP port of the first BMC; 0 takes any that are free")
        ->type_name("N")
        ->check(Between(0U, 65535U))
        ->capture_default_str();
    app.add_option("--silent", options.silent, "The last N of them answer nothing")->type_name("N");
    app.add_option("--cipher-suite", options.suite, "The only one that they have")
        ->type_name("N")
        ->check(CLI::IsMember({1, 2, 3, 15, 16, 17}).description("1, 2, 3, 15, 16 or 17"))
        ->capture_default_str();
    app.add_option("--delay", options.delay, "What the network adds to a round trip")
        ->type_name("MILLISECONDS")
        ->check(Between(0.0, 60000.0));
    app.add_option("--latency", options.latency,
                   "How long a BMC takes for a request, one at a time")
        ->type_name("MILLISECONDS")
        ->check(Between(0.0, 60000.0));
    app.add_option("--loss", options.loss, "How many packets of a hundred get lost, each way")
        ->type_name("PERCENT")
        ->check(Between(0.0, 100.0));
    app.add_option("--seed", options.seed, "Another one loses other packets")
        ->type_name("N")
        ->capture_default_str();
    app.footer(
        "It writes the place of each BMC on a line, as --from of ipmisel takes it, and serves "
        "until "
        "Ctrl-C or\nSIGTERM:\n"
        "  ipmisel-simulator --server examples/rack-server.json &\n"
        "  IPMISEL_PASSWORD=secret ipmisel collect --from lan:127.0.0.1:6230 --user root\n");
    try {
        app.parse(argc, argv);
    } catch (const CLI::Success& wanted) {  // help
        return app.exit(wanted);
    } catch (const CLI::ParseError& error) {
        const auto unexpected = app.remaining();
        std::cerr << "ipmisel-simulator: "
                  << (unexpected.empty() ? error.what() : "does not expect " + unexpected.front())
                  << "; see ipmisel-simulator --help\n";
        return kExitUsage;
    }
    options.silent = std::min(options.silent, options.controllers);
    for (const int signal : {SIGINT, SIGTERM}) std::signal(signal, [](int) { gEnded = 1; });
    rlimit limit{};
    if (getrlimit(RLIMIT_NOFILE, &limit) == 0) {  // a port a BMC
        limit.rlim_cur = limit.rlim_max;
        setrlimit(RLIMIT_NOFILE, &limit);
    }
    try {
        const auto ports = MakePorts(options);
        for (const auto& port : ports) std::cout << "lan:127.0.0.1:" << port->port() << "\n";
        std::cout << std::flush;
        Serve(ports);
    } catch (const std::exception& error) {
        std::cerr << "ipmisel-simulator: " << error.what() << "\n";
        return kExitFailed;
    }
    return 0;
}
