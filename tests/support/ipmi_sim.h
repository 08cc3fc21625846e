#pragma once

#include <arpa/inet.h>
#include <poll.h>
#include <sys/socket.h>

#include <cstdint>
#include <filesystem>
#include <optional>
#include <span>

#include "tests/support/run_program.h"
#include "tests/support/temporary_folder.h"

namespace ipmiseltest {

/// A UDP socket at a port of 127.0.0.1, which is another's to be reached or (0) a new one.
class UdpSocket {
public:
    explicit UdpSocket(std::uint16_t port) {
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        address.sin_port = htons(port);
        socklen_t length = sizeof address;
        auto* const place = reinterpret_cast<sockaddr*>(&address);
        if ((port != 0 ? connect : bind)(socket_, place, length) != 0 ||
            getsockname(socket_, place, &length) != 0) {
            throw std::runtime_error("no UDP port on 127.0.0.1");
        }
        port_ = ntohs(address.sin_port);
    }
    ~UdpSocket() { close(socket_); }
    UdpSocket(const UdpSocket&) = delete;
    UdpSocket& operator=(const UdpSocket&) = delete;

    int Handle() const { return socket_; }
    std::uint16_t Port() const { return port_; }

private:
    int socket_ = socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    std::uint16_t port_ = 0;
};

/// A UDP port of 127.0.0.1 on which nothing listened a moment ago.
inline std::uint16_t FreeUdpPort() { return UdpSocket(0).Port(); }

/// The BMC of OpenIPMI's ipmi_sim, over RMCP+ on a loopback port, with the user "root" and the
/// password "secret". It has cipher suite 3 only and wants the workaround opensesspriv. It ends
/// with the object. Ask Missing() first and skip the test where it answers something.
class IpmiSim {
public:
    /// Why it cannot be run here; empty when it can.
    static std::string Missing() {
#ifndef IPMISEL_LAN
        return "built without access over the network";
#endif
        return std::system("command -v ipmi_sim >/dev/null") == 0
                   ? ""
                   : "ipmi_sim is not installed (package openipmi)";
    }
    /// A line for the event log. ipmi_sim gives the record an ID of its own, from 1, and a record
    /// with a time stamp (type below 0xE0) the time that it has itself.
    static std::string SelLine(std::span<const std::uint8_t> record) {
        std::string line = "sel_add 0x20";
        for (const std::uint8_t byte : record.subspan(2)) line += " " + std::to_string(byte);
        return line;
    }

    /// `lines` are commands of ipmi_sim_cmd(5) for the BMC, as SelLine makes them.
    explicit IpmiSim(const std::vector<std::string>& lines, unsigned selCapacity = 1000) {
        std::string commands =
            "mc_setbmc 0x20\n"
            "mc_add 0x20 0 no-device-sdrs 0x23 9 8 0x9f 0x1291 0xf02 persist_sdr\n"
            "sel_enable 0x20 " +
            std::to_string(selCapacity) + " 0x0a\n";
        for (const std::string& line : lines) commands += line + "\n";
        folder_.Write("bmc.emu", commands + "mc_enable 0x20\n");
        folder_.Write("lan.conf", LanConf());
        const std::string folder = folder_.path().string();
        std::filesystem::create_directory(folder + "/state");
        process_.emplace(
            folder, std::vector<std::string>{
                        "/bin/sh", "-c",
                        "cd '" + folder + "' && exec ipmi_sim -c lan.conf -f bmc.emu -s state -n"});
        if (!Eventually([this] { return Answers(); })) {
            throw std::runtime_error("ipmi_sim does not answer: " + process_->Errors());
        }
    }
    std::string Place() const { return "127.0.0.1:" + std::to_string(port_); }

private:
    std::string LanConf() const {
        std::string auths;
        for (const char* level : {"callback", "user", "operator", "admin"}) {
            auths += "allowed_auths_" + std::string(level) + " none md2 md5 straight\n";
        }
        return "name \"x\"\nset_working_mc 0x20\nstartlan 1\naddr 127.0.0.1 " +
               std::to_string(port_) + "\npriv_limit admin\n" + auths +
               "guid a123456789abcdefa123456789abcdef\nendlan\n"
               "user 1 true \"\" \"test\" user 10 none md2 md5 straight\n"
               "user 2 true \"root\" \"secret\" admin 10 none md2 md5 straight\n";
    }
    /// Whether it tells its authentication capabilities (IPMI 1.5 packet, no session).
    bool Answers() const {
        constexpr char kRequest[] =
            "\x06\0\xFF\x07\0\0\0\0\0\0\0\0\0\x09\x20\x18\xC8\x81\0\x38\x8E\x04\xB5";
        const UdpSocket console(port_);
        pollfd wait{console.Handle(), POLLIN, 0};
        std::uint8_t answer[256];
        return send(console.Handle(), kRequest, sizeof kRequest - 1, 0) > 0 &&
               poll(&wait, 1, 20) == 1 && recv(console.Handle(), answer, sizeof answer, 0) > 0;
    }

    TemporaryFolder folder_;
    std::uint16_t port_ = FreeUdpPort();
    std::optional<RunningProgram> process_;
};

}  // namespace ipmiseltest
