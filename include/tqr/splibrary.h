#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <span>

namespace NQORTQR20 {
class Transport;

/// The frames of SPLibrary::sendIPMICommand. A request: the start byte, the responder's slave
/// address, NetFn, LUN, command, number of data bytes (little-endian, 32 bits), data, zeros up to
/// the least length. A response, in the same buffer: the completion code, and further on once more
/// with the response data behind it; every other byte is 0.
namespace frame {
constexpr std::uint8_t kStart = 0x01;
constexpr std::uint8_t kResponder = 0x20;  ///< the BMC
constexpr std::size_t kNetFnAt = 2;
constexpr std::size_t kLunAt = 3;
constexpr std::size_t kCommandAt = 4;
constexpr std::size_t kCountAt = 5;
constexpr std::size_t kDataAt = 9;
constexpr std::size_t kLeastLength = 15;

constexpr std::size_t kCompletionCodeAt = 4;
constexpr std::size_t kResponseAt = 8;      ///< completion code, response data
constexpr std::size_t kResponseDataAt = 9;  ///< in IPMI order

/// Lays a request out in a buffer that holds zeros, from kDataAt + data.size() bytes on.
inline void LayOutRequest(std::span<std::uint8_t> buffer, std::uint8_t netFn, std::uint8_t lun,
                          std::uint8_t command, std::span<const std::uint8_t> data = {}) {
    buffer[0] = kStart;
    buffer[1] = kResponder;
    buffer[kNetFnAt] = netFn;
    buffer[kLunAt] = lun;
    buffer[kCommandAt] = command;
    for (std::size_t i = kCountAt, count = data.size(); i < kDataAt; ++i, count >>= 8) {
        buffer[i] = static_cast<std::uint8_t>(count);
    }
    std::copy(data.begin(), data.end(), buffer.subspan(kDataAt).begin());
}
}  // namespace frame

/// Access to one BMC node. The host owns the objects of the nodes of a collection.
class SPLibrary {
public:
    /// An object of its own over a transport, outside the host's list of nodes.
    explicit SPLibrary(std::unique_ptr<Transport> transport, bool integratedBmc = false);
    ~SPLibrary();
    SPLibrary(const SPLibrary&) = delete;
    SPLibrary& operator=(const SPLibrary&) = delete;

    /// Number of BMC nodes of the system that is collected from.
    static int GetNumberBMCNode();
    /// The object of a node (from 0); null when there is no such node. Owned by the host.
    static SPLibrary* GetSplibraryInstance(int node);
    /// Whether an in-band IPMI driver is usable.
    static bool IsIPMIDriversPresent();
    /// Whether the management controller is of the newer integrated kind.
    bool IsiBMCMachine() const;

    /// Sends one request and receives its response in the same buffer, laid out as `frame` has
    /// them.
    ///
    /// `bufferSize` is the size of the buffer. `*length` is not read; on success it is the number
    /// of response data bytes after the completion code. The buffer is cleared before the response
    /// is written; a longer response is cut to it. False when the request could not be sent or no
    /// response came; the buffer then keeps the request. `flag` is true in every call and has no
    /// meaning here.
    bool sendIPMICommand(unsigned char* buffer, int* length, int bufferSize, bool flag);

    /// Says that a request, laid out as sendIPMICommand wants it, will be sent soon. The host may
    /// ask at once, several at a time, so that the answer is there by then; what is seen of the
    /// BMC is the same. Only for requests that change nothing and that are sent unless the BMC
    /// fails. Since 1.1.
    void announceIPMICommand(const unsigned char* buffer, int bufferSize);

private:
    friend struct HostAccess;  // the host's own
    struct Impl;
    std::unique_ptr<Impl> impl_;
};

}  // namespace NQORTQR20
