#pragma once

#include <string>
#include <string_view>

#include "tqr/plugin.h"

namespace ipmisel {

/// What decides in which forms the notice is shown.
struct NoticeSetting {
    bool bootableMedium = false;  ///< the collection runs from a bootable medium
    std::string_view machineType;
    bool supervisorAdapter = false;  ///< the machine has one on board
};

/// Whether links are of use to the person who reads the notice. They are not where it is read on a
/// text console: on a bootable medium, which has no browser; on the models that are run without a
/// display; through a supervisor adapter, which forwards text.
bool ShowsLinks(const NoticeSetting& setting);

std::string DriverNoticePlain();
std::string DriverNoticeMarkup();

/// Notifies the person who collects that the machine has a BMC and no driver to reach it with.
void ShowDriverNotice(NQORTQR20::TCPluginCallbacks* context, std::string_view machineType);

}  // namespace ipmisel
