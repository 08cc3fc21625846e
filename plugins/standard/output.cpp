#include "plugins/standard/output.h"

#include <cmath>

namespace standard {

bool Output::Begin(const char* className) {
    const auto status = NQORTQR20::fdrGetInstance(handle_, className);
    Note(status);
    return status.code == NQORTQR20::kStatusOk;
}

void Output::End() { Note(NQORTQR20::fdrAddInstance(handle_)); }

void Output::Text(const char* name, std::string_view value) {
    if (value.empty()) return;
    Note(NQORTQR20::fdrAddProperty(handle_, name, std::string(value).c_str()));
}

void Output::Integer(const char* name, std::optional<std::int64_t> value) {
    if (value) Note(NQORTQR20::fdrAddIntegerProperty(handle_, name, *value));
}

void Output::Real(const char* name, std::optional<double> value) {
    if (value && std::isfinite(*value)) Note(NQORTQR20::fdrAddRealProperty(handle_, name, *value));
}

void Output::Boolean(const char* name, std::optional<bool> value) {
    if (value) Note(NQORTQR20::fdrAddBooleanProperty(handle_, name, *value));
}

void Output::Time(const char* name, std::optional<std::int64_t> seconds) {
    if (seconds) Note(NQORTQR20::fdrAddTimeProperty(handle_, name, *seconds));
}

void Output::Texts(const char* name, std::span<const std::string> values) {
    if (values.empty()) return;
    std::vector<const char*> texts;
    texts.reserve(values.size());
    for (const std::string& value : values) texts.push_back(value.c_str());
    Note(NQORTQR20::fdrAddTextListProperty(handle_, name, texts.data(),
                                           static_cast<std::uint32_t>(texts.size())));
}

void Output::Note(NQORTQR20::TTQRStatusCode status) {
    if (status.code != NQORTQR20::kStatusOk) failed_ = true;
}

}  // namespace standard
