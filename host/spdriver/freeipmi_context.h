#pragma once

#include <freeipmi/freeipmi.h>

#include <memory>
#include <optional>
#include <string>

#include "host/spdriver/source.h"

namespace tqrhost {

struct CloseContext {
    void operator()(ipmi_ctx_t context) const {
        ipmi_ctx_close(context);
        ipmi_ctx_destroy(context);
    }
};
using FreeIpmiContext = std::unique_ptr<ipmi_ctx, CloseContext>;

/// A context that is not open yet. Throws SourceError when there is no memory for it.
FreeIpmiContext MakeContext();

/// One line for the user: what failed at `place` and what to do, for an error number of FreeIPMI.
std::string ErrorAdvice(const std::string& place, int error);

/// One notice line of the host's own.
void LogNoResponse(const RequestFrame& request, const char* why);

/// The BMC at the other end of an open context.
class FreeIpmiTransport : public Transport {
public:
    explicit FreeIpmiTransport(FreeIpmiContext context) : context_(std::move(context)) {}
    std::optional<Response> Exchange(const RequestFrame& request) override;

private:
    FreeIpmiContext context_;
};

}  // namespace tqrhost
