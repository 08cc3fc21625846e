#include "host/core/sink.h"

namespace tqrhost {

bool WholeInstanceSink::OpenInstance(std::string_view className) {
    open_.className = className;
    open_.properties.clear();
    return true;
}

bool WholeInstanceSink::AddProperty(std::string_view name, const PropertyValue& value) {
    open_.properties.emplace_back(name, value);
    return true;
}

bool WholeInstanceSink::CloseInstance() { return Take(open_); }

}  // namespace tqrhost
