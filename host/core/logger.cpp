#include <algorithm>
#include <memory>
#include <utility>
#include <vector>

#include "host/core/host.h"
#include "tqr/log.h"

namespace NQORTQR20 {
namespace {

class CoreLogger : public ILogger {
public:
    void Write(ETQRLogSeverity severity, const char* text) override {
        if (!Enabled(severity)) return;
        const std::string_view line = text == nullptr ? "" : text;
        // By index and with a hold on the consumer: one that is called may add or remove others.
        for (std::size_t i = 0; i < consumers_.size(); ++i) {
            const std::shared_ptr<const Consumer> consumer = consumers_[i];
            if (severity > consumer->upTo) continue;
            try {
                consumer->consume(severity, line);
            } catch (...) {
                // A line is written from destructors too. A reader that fails loses its line.
            }
        }
    }

    bool Enabled(ETQRLogSeverity severity) const override { return severity <= highest_; }

    int Add(ETQRLogSeverity upTo, LogConsumer consume) {
        consumers_.push_back(
            std::make_shared<const Consumer>(Consumer{++identity_, upTo, std::move(consume)}));
        FindHighest();
        return identity_;
    }

    void Remove(int identity) {
        std::erase_if(consumers_, [=](const auto& each) { return each->identity == identity; });
        FindHighest();
    }

private:
    struct Consumer {
        int identity;
        ETQRLogSeverity upTo;
        LogConsumer consume;
    };

    void FindHighest() {
        highest_ = kNobody;
        for (const auto& consumer : consumers_) {
            highest_ = std::max<int>(highest_, consumer->upTo);
        }
    }

    static constexpr int kNobody = -1;
    std::vector<std::shared_ptr<const Consumer>> consumers_;
    int highest_ = kNobody;
    int identity_ = 0;
};

CoreLogger& Logger() {
    static CoreLogger logger;
    return logger;
}

}  // namespace

void fdrWriteLog(ILogger::ETQRLogSeverity severity, const char* text) {
    Logger().Write(severity, text);
}

bool fdrLogEnabled(ILogger::ETQRLogSeverity severity) { return Logger().Enabled(severity); }

ILogger* TRootObject::GetCoreLogger() { return &Logger(); }

int AddLogConsumer(ILogger::ETQRLogSeverity upTo, LogConsumer consumer) {
    return Logger().Add(upTo, std::move(consumer));
}

void RemoveLogConsumer(int identity) { Logger().Remove(identity); }

}  // namespace NQORTQR20
