#include "host/spdriver/kernel_device.h"

#include <fcntl.h>
#include <linux/ipmi.h>
#include <sys/ioctl.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstddef>
#include <vector>

namespace tqrhost {
namespace {

/// More than the driver ever hands out (IPMI_MAX_MSG_LENGTH); it cuts what does not fit.
constexpr std::size_t kMaxMessage = 1024;

}  // namespace

KernelDevice::~KernelDevice() {
    if (file_ >= 0) close(file_);
}

int KernelDevice::Open(const std::filesystem::path& file) {
    file_ = open(file.c_str(), O_RDWR | O_CLOEXEC | O_NONBLOCK);
    if (file_ < 0) return errno;
    unsigned version = 0;  // a device of another kind does not know the question
    return ioctl(file_, IPMICTL_GET_MY_ADDRESS_CMD, &version) < 0 ? errno : 0;
}

int KernelDevice::Send(long id, const ipmi::Command& command) {
    ipmi_system_interface_addr address{};
    address.addr_type = IPMI_SYSTEM_INTERFACE_ADDR_TYPE;
    address.channel = IPMI_BMC_CHANNEL;
    address.lun = command.lun;
    std::vector<std::uint8_t> data = command.data;  // the driver's structure is not const
    ipmi_req request{};
    request.addr = reinterpret_cast<unsigned char*>(&address);
    request.addr_len = sizeof address;
    request.msgid = id;
    request.msg.netfn = command.netFn;
    request.msg.cmd = command.command;
    request.msg.data_len = static_cast<unsigned short>(data.size());
    request.msg.data = data.data();
    return ioctl(file_, IPMICTL_SEND_COMMAND, &request) < 0 ? errno : 0;
}

std::optional<IpmiDevice::Message> KernelDevice::Receive(int* error) {
    // Events that nobody has asked for may stand between the answers.
    for (;;) {
        std::array<std::uint8_t, kMaxMessage> data{};
        ipmi_addr address{};
        ipmi_recv received{};
        received.addr = reinterpret_cast<unsigned char*>(&address);
        received.addr_len = sizeof address;
        received.msg.data = data.data();
        received.msg.data_len = static_cast<unsigned short>(data.size());
        // EMSGSIZE: the message has come, cut to the room.
        if (ioctl(file_, IPMICTL_RECEIVE_MSG_TRUNC, &received) < 0 && errno != EMSGSIZE) {
            *error = errno == EAGAIN ? 0 : errno;
            return std::nullopt;
        }
        if (received.recv_type != IPMI_RESPONSE_RECV_TYPE) continue;
        return Message{received.msgid,
                       Response(data.begin(), data.begin() + received.msg.data_len)};
    }
}

}  // namespace tqrhost
