#pragma once

#include <cstdint>
#include <filesystem>
#include <optional>

#include "host/spdriver/transport.h"
#include "ipmi/command.h"

namespace tqrhost {

/// A device of the kernel's IPMI driver, as far as it is used here.
class IpmiDevice {
public:
    struct Message {
        long id = 0;        ///< as it was sent with
        Response response;  ///< completion code, then data
    };

    virtual ~IpmiDevice() = default;
    /// 0, or the error number of the system.
    virtual int Send(long id, const ipmi::Command& command) = 0;
    /// The next message that has come. Empty when none is waiting; *error is then 0, or the error
    /// number of the system.
    virtual std::optional<Message> Receive(int* error) = 0;
    /// What to wait on for input; -1 for nothing.
    virtual int Descriptor() const = 0;
};

/// The driver's device file (linux/ipmi.h, the driver's documentation
/// Documentation/driver-api/ipmi.rst).
class KernelDevice : public IpmiDevice {
public:
    KernelDevice() = default;
    ~KernelDevice() override;
    KernelDevice(const KernelDevice&) = delete;
    KernelDevice& operator=(const KernelDevice&) = delete;

    /// 0, or the error number of the system; once.
    int Open(const std::filesystem::path& file);
    int Send(long id, const ipmi::Command& command) override;
    std::optional<Message> Receive(int* error) override;
    int Descriptor() const override { return file_; }

private:
    int file_ = -1;
};

}  // namespace tqrhost
