#pragma once

#include <memory>

namespace NQORTQR20 {
class SPLibrary;
class Transport;
struct NodeCompleteness;
/// How whole the reading through a library object is, as the host saw it.
NodeCompleteness CompletenessOf(const SPLibrary& library);

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

    /// Sends one request and receives its response in the same buffer.
    ///
    /// Request frame: 0x01, responder address 0x20, NetFn, LUN, command, number of data bytes as a
    /// little-endian 32-bit count, data from byte 9. Response frame: completion code in byte 4;
    /// from byte 8 the completion code again and the response data in IPMI order.
    ///
    /// `bufferSize` is the size of the buffer. `*length` is not read; on success it is the number
    /// of response data bytes after the completion code. The buffer is cleared before the response
    /// is written; a longer response is cut to it. False when the request could not be sent or no
    /// response came; the buffer then keeps the request. `flag` is true in every call and has no
    /// meaning here.
    bool sendIPMICommand(unsigned char* buffer, int* length, int bufferSize, bool flag);

private:
    friend NodeCompleteness CompletenessOf(const SPLibrary& library);
    struct Impl;
    std::unique_ptr<Impl> impl_;
};

}  // namespace NQORTQR20
