#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <memory>
#include <nlohmann/json.hpp>
#include <system_error>

#include "program/commands/failure.h"
#include "program/reports/json_text.h"
#include "program/reports/report.h"

namespace ipmisel {
namespace {

using Json = nlohmann::ordered_json;

/// On one line. All but ASCII is escaped, so that nothing in it reaches a terminal.
std::string Text(const Json& json) {
    return json.dump(-1, ' ', true, Json::error_handler_t::replace);
}

Json AccountOf(const tqrhost::SourceAccount& account) {
    Json json = Json::object();
    json["announced"] = account.announced ? Json(*account.announced) : Json(nullptr);
    json["read"] = account.read;
    return json;
}

Json CompletenessOf(const ReportEnd& end) {
    Json nodes = Json::array();
    for (std::size_t node = 0; node < end.completeness.size(); ++node) {
        const tqrhost::NodeCompleteness& account = end.completeness[node];
        Json log = AccountOf(account.log);
        log["exported"] = node < end.exported.size() ? end.exported[node] : 0;
        Json faults = Json::array();
        for (const tqrhost::ReadFault& fault : account.faults) {
            Json json = {{"what", fault.what}};
            if (!fault.record.empty()) json["record"] = fault.record;
            json["problem"] = fault.problem;
            faults.push_back(std::move(json));
        }
        nodes.push_back({{"node", node},
                         {"log", std::move(log)},
                         {"sensors", AccountOf(account.sensors)},
                         {"faults", std::move(faults)}});
    }
    return nodes;
}

/// A file without a name, for what has to wait.
class Spool {
public:
    Spool() {
        std::error_code error;
        const auto folder = std::filesystem::temp_directory_path(error);
        std::string name = (folder / "ipmisel-XXXXXX").string();
        const int file = error ? -1 : mkostemp(name.data(), O_CLOEXEC);
        if (file >= 0) {
            unlink(name.c_str());
            file_.reset(fdopen(file, "w+"));
        }
        if (!file_) Fail(error ? error.value() : errno);
    }
    void Write(const std::string& text) {
        if (std::fwrite(text.data(), 1, text.size(), file_.get()) != text.size()) Fail(errno);
    }
    void CopyTo(OutputFile& out) {
        if (std::fflush(file_.get()) != 0) Fail(errno);
        std::rewind(file_.get());
        std::array<char, 1 << 14> room;
        for (std::size_t n; (n = std::fread(room.data(), 1, room.size(), file_.get())) > 0;) {
            out.Write({room.data(), n});
        }
        if (std::ferror(file_.get()) != 0) Fail(errno);
    }

private:
    struct Close {
        void operator()(std::FILE* file) const { std::fclose(file); }
    };
    [[noreturn]] static void Fail(int error) {
        throw Failure(kExitUsage, std::string("cannot keep the report in a temporary file: ") +
                                      std::strerror(error) +
                                      "; make room there, or name another folder in TMPDIR");
    }

    std::unique_ptr<std::FILE, Close> file_;
};

/// The status stands before the instances and is known after them: they wait in a spool.
class JsonReport : public ReportWriter {
public:
    JsonReport(OutputFile& out, const ReportHead& head) : out_(out), head_(head) {}
    void Add(const tqrhost::Instance& instance) override {
        spool_.Write((any_ ? ",\n    " : "\n    ") + JsonInstance(instance));
        any_ = true;
    }
    void Finish(const ReportEnd& end) override {
        out_.Write("{\n  \"source\": " + JsonText(head_.source));
        out_.Write(",\n  \"plugin\": {\"name\": " + JsonText(head_.plugin.name) +
                   ", \"version\": " + JsonText(head_.plugin.version) +
                   ", \"interface\": " + JsonText(head_.plugin.interfaceVersion) + "}");
        out_.Write(",\n  \"status\": {\"code\": " + std::to_string(end.status.code) +
                   ", \"text\": " + JsonText(end.status.TranslateStatusCode()) + "}");
        out_.Write(",\n  \"instances\": [");
        spool_.CopyTo(out_);
        out_.Write(any_ ? "\n  ]" : "]");
        out_.Write(",\n  \"notices\": " + Text(end.notices));
        out_.Write(",\n  \"completeness\": " + Text(CompletenessOf(end)) + "\n}\n");
    }

private:
    OutputFile& out_;
    ReportHead head_;
    Spool spool_;
    bool any_ = false;
};

class NdjsonReport : public ReportWriter {
public:
    explicit NdjsonReport(OutputFile& out) : out_(out) {}
    void Add(const tqrhost::Instance& instance) override {
        out_.Write(JsonInstance(instance) + "\n");
    }
    void Finish(const ReportEnd&) override {}

private:
    OutputFile& out_;
};

}  // namespace

std::unique_ptr<ReportWriter> MakeJsonReport(OutputFile& out, const ReportHead& head) {
    return std::make_unique<JsonReport>(out, head);
}

std::unique_ptr<ReportWriter> MakeNdjsonReport(OutputFile& out, const ReportHead&) {
    return std::make_unique<NdjsonReport>(out);
}

}  // namespace ipmisel
