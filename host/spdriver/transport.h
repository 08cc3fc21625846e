#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <span>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include "host/core/host.h"

namespace tqrhost {

/// One request frame as the plug-in laid it out: 0x01, responder address, NetFn, LUN, command,
/// number of data bytes (little-endian, 32 bits), data from byte 9.
class RequestFrame {
public:
    /// Takes the frame from the start of a transfer buffer; empty when the buffer is shorter than
    /// the frame says. Frames shorter than 15 bytes are padded to 15, as far as the buffer goes.
    static std::optional<RequestFrame> FromBuffer(std::span<const std::uint8_t> buffer);

    std::uint8_t netFn() const { return bytes_[2]; }
    std::uint8_t lun() const { return bytes_[3]; }
    std::uint8_t command() const { return bytes_[4]; }
    std::span<const std::uint8_t> data() const { return std::span(bytes_).subspan(9, dataLength_); }
    std::span<const std::uint8_t> bytes() const { return bytes_; }

private:
    std::vector<std::uint8_t> bytes_;
    std::size_t dataLength_ = 0;
};

/// Completion code, then the response data. Never empty.
using Response = std::vector<std::uint8_t>;

/// The way to one BMC node.
class Transport {
public:
    virtual ~Transport() = default;
    /// Empty when the request could not be sent or no response came.
    virtual std::optional<Response> Exchange(const RequestFrame& request) = 0;
};

/// Why a source could not be opened; what() is one line for the user that says what to do.
struct SourceError : std::runtime_error {
    using std::runtime_error::runtime_error;
};
/// The sources are named wrongly: a kind that is not known, or kinds that do not go together.
struct SourceUsageError : SourceError {
    using SourceError::SourceError;
};

/// What the user said about access; each kind of source takes what concerns it.
struct SourceOptions {
    std::optional<std::string> user;
    std::function<std::string()> password;          ///< asked for only where a password is needed
    std::function<std::vector<std::uint8_t>()> kg;  ///< the BMC's own key; empty: it has none
    std::optional<int> cipherSuite;                 ///< by number; else the best that the BMC has
    std::string privilege = "admin";                ///< user, operator, admin
    std::vector<std::string> workarounds;           ///< names of KnownWorkarounds()
    std::optional<int> window;                      ///< requests outstanding, 1 to 15
    double timeoutSeconds = 20;  ///< how long one request may go unanswered in all
};

/// A place where a machine is reached: its facts and one transport a BMC node.
struct Source {
    MachineFacts facts;
    std::vector<std::unique_ptr<Transport>> nodes;
};

/// Opens "inband", "lan:HOST", "sim:FILE", "replay:FILE". Several sources must all be of a kind
/// that can be joined (lan:); their nodes follow each other. Throws SourceError, also for a kind
/// that is not built in.
Source OpenSources(const std::vector<std::string>& sources, const SourceOptions& options);

struct WorkaroundInfo {
    std::string_view name;
    std::string_view description;
};
/// The known deviations of BMCs that a user may ask to put up with.
std::span<const WorkaroundInfo> KnownWorkarounds();

/// One read that brought nothing, or too little.
struct ReadFault {
    std::string what;     ///< the command, as the IPMI standard calls it
    std::string record;   ///< record or FRU device ID, four hexadecimal digits; empty without one
    std::string problem;  ///< "no response", "completion code cb", "short answer", ...
    bool ofLogOrSensors;  ///< else of a FRU device
    bool operator==(const ReadFault&) const = default;
};
/// What a node announced of a source, and what was read of it.
struct SourceAccount {
    std::optional<unsigned> announced;  ///< empty when it was not asked, or did not say
    unsigned read = 0;
};
/// How whole the reading of a node is, as the host saw it go by.
struct NodeCompleteness {
    SourceAccount log;
    SourceAccount sensors;
    std::vector<ReadFault> faults;
    /// Event log and sensor repository were read as far as they were announced, without a fault.
    bool Whole() const;
};
/// One for each node of the open machine.
std::vector<NodeCompleteness> GetCompleteness();

/// Makes the nodes and facts of a source the machine that SPLibrary and the core speak of; until
/// the next call, or CloseMachine.
void OpenMachine(Source source);
void CloseMachine();

/// Wraps the transports of a source so that every exchange is appended to the capture file.
/// Throws SourceError when the file cannot be written. The file is complete when the transports
/// are gone; a failure to write in mid-course is told by CaptureWriter::Failed of the result.
class CaptureWriter {
public:
    virtual ~CaptureWriter() = default;
    /// Flushes; false when anything could not be written.
    virtual bool Finish() = 0;
};
std::shared_ptr<CaptureWriter> RecordTo(const std::string& file, Source& source);

}  // namespace tqrhost
