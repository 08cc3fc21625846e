#pragma once

#include <stdexcept>
#include <string>
#include <vector>

#include "simulator/simulated_bmc.h"

namespace ipmisim {

/// A simulated server: the facts of the machine and its BMCs.
struct ServerDescription {
    std::string machineType;
    bool integratedBmc = false;
    bool ipmiDriver = true;
    bool ipmiLan = false;
    std::optional<std::string> localTime;  ///< CIM text form
    std::vector<Bytes> smbios;
    std::vector<BmcDescription> bmcs;
};

/// what() is one line: file, line where known, key, reason.
struct ServerFileError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

/// Reads the JSON description of a simulated server; comments are allowed. Refuses unknown keys,
/// wrong types and bad hexadecimal. Throws ServerFileError.
ServerDescription ReadServerFile(const std::string& file);
/// The same from text; `name` stands for the file in messages.
ServerDescription ParseServer(const std::string& text, const std::string& name);

}  // namespace ipmisim
