#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <memory>
#include <nlohmann/json.hpp>
#include <optional>
#include <span>
#include <string>
#include <system_error>
#include <utility>
#include <vector>

#include "base/hex.h"
#include "base/text.h"
#include "host/spdriver/capture.h"
#include "tqr/datetime.h"

namespace tqrhost {
namespace {

std::string FactsLine(const Source& source, const std::vector<std::string>& classes) {
    nlohmann::ordered_json smbios = nlohmann::ordered_json::array();
    for (const auto& structure : source.facts.smbios) smbios.push_back(ipmisel::HexText(structure));
    const nlohmann::ordered_json line = {
        {"ipmisel_capture", 1},
        {"machine_type", source.facts.machineType},
        {"integrated_bmc", source.facts.integratedBmc},
        {"ipmi_driver", source.facts.ipmiDriver},
        {"ipmi_lan", source.facts.ipmiLan},
        {"local_time", source.facts.localTime.value_or("")},
        {"smbios", smbios},
        {"nodes", source.nodes.size()},
        {"classes", classes},
    };
    // The machine's own texts need not be UTF-8.
    return line.dump(-1, ' ', false, nlohmann::ordered_json::error_handler_t::replace) + "\n";
}

/// The capture file. Every line goes out by itself, so that a run that is cut leaves what it read.
class CaptureFile : public CaptureWriter {
public:
    CaptureFile(const std::string& name, const Source& source,
                const std::vector<std::string>& classes) {
        const std::string facts = FactsLine(source, classes);
        if (facts.size() > NQORTQR20::kMaxCaptureLine) {
            throw SourceError("the capture " + name + " cannot be written: the machine's SMBIOS " +
                              "is longer than a line of it may be; collect without --record");
        }
        // A symbolic link to a file or to nothing is replaced, not followed; what is there before
        // is emptied, and no one's to remove. A new file is for the user alone.
        std::error_code error;
        const auto target = std::filesystem::status(name, error);
        if (!name.starts_with("/dev/") && std::filesystem::is_symlink(name, error) &&
            (std::filesystem::is_regular_file(target) || !std::filesystem::exists(target))) {
            unlink(name.c_str());
        }
        int file = open(name.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0600);
        const bool created = file >= 0;
        if (!created && errno == EEXIST) {
            file = open(name.c_str(), O_WRONLY | O_TRUNC | O_CLOEXEC);
        }
        if (file >= 0) file_.reset(fdopen(file, "w"));
        if (file_) {
            setvbuf(file_.get(), nullptr, _IOLBF, BUFSIZ);
            Write(facts);
        }
        if (file_ && !failed_) return;
        const std::string reason =
            errno == EINTR ? "nobody has opened its other end" : std::strerror(errno);
        if (created) unlink(name.c_str());
        throw SourceError("the capture " + name + " cannot be written: " + reason +
                          "; name another file");
    }
    bool Finish() override {
        if (std::fflush(file_.get()) != 0) failed_ = true;
        return !failed_;
    }
    void Write(const std::string& line) {
        failed_ = failed_ || line.size() > NQORTQR20::kMaxCaptureLine ||
                  std::fputs(line.c_str(), file_.get()) == EOF;
    }

private:
    struct Close {
        void operator()(std::FILE* file) const { std::fclose(file); }
    };
    std::unique_ptr<std::FILE, Close> file_;
    bool failed_ = false;
};

/// Writes down what passes. The time that the plug-ins see stands still between two exchanges, so
/// that a replay can show them the same at Get SEL Time, from which they make the controller's
/// clock.
class RecordingTransport : public Transport {
public:
    RecordingTransport(std::unique_ptr<Transport> transport, std::size_t node, bool clockRuns,
                       std::shared_ptr<CaptureFile> capture)
        : transport_(std::move(transport)),
          node_(node),
          clockRuns_(clockRuns),
          capture_(std::move(capture)) {}
    std::optional<Response> Exchange(const RequestFrame& request) override {
        const std::int64_t before = Now().TotalMicroseconds();
        auto response = transport_->Exchange(request);
        if (response && response->empty()) response.reset();
        if (clockRuns_) {
            std::string now = SystemTime().ToString();
            SetLocalTime(std::move(now));
        }
        std::string line = "{\"node\": " + std::to_string(node_) + ", \"request\": \"" +
                           ipmisel::HexText(request.bytes()) + "\", \"response\": " +
                           (response ? "\"" + ipmisel::HexText(*response) + "\"" : "null");
        if (request.code() == ipmi::kGetSelTime) {
            const auto took = static_cast<double>(Now().TotalMicroseconds() - before) / 1e6;
            line += ", \"at\": \"" + Now().ToString() +
                    "\", \"took\": " + ipmisel::Format("%.6f", std::max(took, 0.0));
        }
        capture_->Write(line + "}\n");
        return response;
    }

private:
    static NQORTQR20::TCIMDateTime Now() { return NQORTQR20::TOSSpecific::GetLocalTime(); }

    std::unique_ptr<Transport> transport_;
    std::size_t node_;
    bool clockRuns_;
    std::shared_ptr<CaptureFile> capture_;
};

}  // namespace
}  // namespace tqrhost

namespace NQORTQR20 {

std::shared_ptr<CaptureWriter> RecordTo(const std::string& file, Source& source,
                                        const std::vector<std::string>& classes) {
    const bool clockRuns = !source.facts.localTime;
    if (clockRuns) source.facts.localTime = SystemTime().ToString();
    auto capture = std::make_shared<tqrhost::CaptureFile>(file, source, classes);
    for (std::size_t node = 0; node < source.nodes.size(); ++node) {
        SourceNode& recorded = source.nodes[node];
        recorded.transport = std::make_unique<tqrhost::RecordingTransport>(
            std::move(recorded.transport), node, clockRuns, capture);
    }
    return capture;
}

}  // namespace NQORTQR20
