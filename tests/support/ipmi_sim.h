#pragma once

#include <arpa/inet.h>
#include <fcntl.h>
#include <netinet/in.h>
#include <poll.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/socket.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <optional>
#include <span>
#include <sstream>
#include <stdexcept>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "tests/support/temporary_folder.h"

namespace ipmiseltest {

/// A UDP port of 127.0.0.1 on which nothing listened a moment ago.
inline std::uint16_t FreeUdpPort() {
    const int socket = ::socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    socklen_t length = sizeof address;
    const bool bound =
        bind(socket, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0 &&
        getsockname(socket, reinterpret_cast<sockaddr*>(&address), &length) == 0;
    close(socket);
    if (!bound) throw std::runtime_error("no free UDP port on 127.0.0.1");
    return ntohs(address.sin_port);
}

/// The BMC of OpenIPMI's ipmi_sim, over RMCP+ on a loopback port, with the user "root" and the
/// password "secret". It has cipher suite 3 only and wants the workaround opensesspriv. It ends
/// with the object. Ask Missing() first and skip the test where it answers something.
class IpmiSim {
public:
    /// Why it cannot be run here; empty when it can.
    static std::string Missing() {
        std::istringstream folders(std::getenv("PATH") == nullptr ? "" : std::getenv("PATH"));
        for (std::string folder; std::getline(folders, folder, ':');) {
            if (access((folder + "/ipmi_sim").c_str(), X_OK) == 0) return "";
        }
        return "ipmi_sim is not installed (package openipmi)";
    }
    /// A line for the event log. ipmi_sim gives the record an ID of its own, from 1, and a record
    /// with a time stamp (type below 0xE0) the time that it has itself.
    static std::string SelLine(std::span<const std::uint8_t> record) {
        return "sel_add 0x20" + Numbers(record.subspan(2));
    }
    /// A line for the sensor repository: a whole record.
    static std::string SdrLine(std::span<const std::uint8_t> record) {
        return "main_sdr_add 0x20" + Numbers(record);
    }

    /// `lines` are commands of ipmi_sim_cmd(5) for the BMC, as SelLine and SdrLine make them.
    explicit IpmiSim(const std::vector<std::string>& lines, unsigned selCapacity = 1000) {
        std::string commands =
            "mc_setbmc 0x20\n"
            "mc_add 0x20 0 no-device-sdrs 0x23 9 8 0x9f 0x1291 0xf02 persist_sdr\n"
            "sel_enable 0x20 " +
            std::to_string(selCapacity) + " 0x0a\n";
        for (const std::string& line : lines) commands += line + "\n";
        folder_.Write("bmc.emu", commands + "mc_enable 0x20\n");
        std::filesystem::create_directory(folder_.path() / "state");
        // Somebody else may take the port between the look for it and the start.
        for (int attempt = 0; attempt < 3; ++attempt) {
            Start();
            if (WaitUntilReady()) return;
            Stop();
        }
        std::ifstream log(folder_.path() / "log");
        std::ostringstream text;
        text << log.rdbuf();
        throw std::runtime_error("ipmi_sim does not answer: " + text.str());
    }
    ~IpmiSim() { Stop(); }
    IpmiSim(const IpmiSim&) = delete;
    IpmiSim& operator=(const IpmiSim&) = delete;

    std::uint16_t Port() const { return port_; }
    std::string Place() const { return "127.0.0.1:" + std::to_string(port_); }
    /// Kills it as a BMC that is reset.
    void Stop() {
        if (process_ <= 0) return;
        kill(process_, SIGKILL);
        waitpid(process_, nullptr, 0);
        process_ = -1;
    }

private:
    static std::string Numbers(std::span<const std::uint8_t> bytes) {
        std::string text;
        for (const std::uint8_t byte : bytes) text += " " + std::to_string(byte);
        return text;
    }

    void Start() {
        port_ = FreeUdpPort();
        const std::string config = folder_.Write("lan.conf", LanConf());
        const std::string commands = (folder_.path() / "bmc.emu").string();
        const std::string state = (folder_.path() / "state").string();
        const std::string log = (folder_.path() / "log").string();
        process_ = fork();
        if (process_ < 0) throw std::runtime_error("no process for ipmi_sim");
        if (process_ > 0) return;
        prctl(PR_SET_PDEATHSIG, SIGKILL);
        dup2(open("/dev/null", O_RDONLY), 0);
        dup2(open(log.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600), 1);
        dup2(1, 2);
        execlp("ipmi_sim", "ipmi_sim", "-c", config.c_str(), "-f", commands.c_str(), "-s",
               state.c_str(), "-n", static_cast<char*>(nullptr));
        _exit(127);
    }

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

    /// Asks for the authentication capabilities (IPMI 1.5 packet, no session) until they come.
    bool WaitUntilReady() {
        constexpr std::uint8_t kRequest[] = {0x06, 0x00, 0xFF, 0x07, 0,    0,    0,    0,
                                             0,    0,    0,    0,    0,    0x09, 0x20, 0x18,
                                             0xC8, 0x81, 0x00, 0x38, 0x8E, 0x04, 0xB5};
        const int socket = ::socket(AF_INET, SOCK_DGRAM | SOCK_CLOEXEC, 0);
        sockaddr_in address{};
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        address.sin_port = htons(port_);
        bool ready =
            connect(socket, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0;
        const auto end = std::chrono::steady_clock::now() + std::chrono::seconds(10);
        while (ready && std::chrono::steady_clock::now() < end && process_ > 0) {
            pollfd wait{socket, POLLIN, 0};
            std::uint8_t answer[256];
            if (send(socket, kRequest, sizeof kRequest, 0) > 0 && poll(&wait, 1, 100) == 1 &&
                recv(socket, answer, sizeof answer, 0) > 0) {
                close(socket);
                return true;
            }
            if (waitpid(process_, nullptr, WNOHANG) != 0) process_ = -1;  // it gave up
            std::this_thread::sleep_for(std::chrono::milliseconds(20));
        }
        close(socket);
        return false;
    }

    TemporaryFolder folder_;
    std::uint16_t port_ = 0;
    pid_t process_ = -1;
};

}  // namespace ipmiseltest
