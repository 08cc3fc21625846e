#include "plugins/ipmisel/pass/driver_notice.h"

#include <array>
#include <cstdlib>

#include "plugins/ipmisel/pass/discovery.h"
#include "plugins/ipmisel/texts/machine_families.h"

namespace ipmisel {
namespace {

constexpr std::string_view kDriverDocumentation = "https://docs.kernel.org/driver-api/ipmi.html";

/// How the sentences of the notice are put together.
struct Form {
    std::string_view lineBreak;
    std::string_view beforeLink;  ///< before the address, and before its text when that is another
    std::string_view afterAddress;
    std::string_view afterLink;
    bool addressIsShown;  ///< as the text of the link
};
constexpr Form kPlain{"\n", "", "", "", false};
constexpr Form kMarkup{"<br/>\n", "<a href=\"", "\">", "</a>", true};

std::string Notice(const Form& form) {
    std::string link(form.beforeLink);
    link += kDriverDocumentation;
    link += form.afterAddress;
    if (form.addressIsShown) link += kDriverDocumentation;
    link += form.afterLink;

    const std::array<std::string, 6> lines{
        "A BMC/ZMC was detected, but the IPMI driver is not installed.",
        "Without it the event log and the inventory of the management controller cannot be read.",
        "An IPMI driver package may be had from the support site of your server's maker. The "
        "driver that comes with Linux is described at:",
        link,
        "If no IPMI driver package is available for your machine type from these links, please use "
        "the built in IPMI driver for your Linux release.",
        "Once the driver is installed, please run the collection again."};
    std::string text;
    for (const std::string& line : lines) {
        text += line;
        text += form.lineBreak;
    }
    return text;
}

bool IsBootableMedium() {
    const char* const value = std::getenv("TQR_ISBOOTABLE");
    return value != nullptr && std::string_view(value) == "yes";
}

}  // namespace

bool ShowsLinks(const NoticeSetting& setting) {
    const MachineFamily* const family = FindMachineFamily(setting.machineType);
    const bool headless = family != nullptr && family->headless;
    return !setting.bootableMedium && !headless && !setting.supervisorAdapter;
}

std::string DriverNoticePlain() { return Notice(kPlain); }

std::string DriverNoticeMarkup() { return Notice(kMarkup); }

void ShowDriverNotice(NQORTQR20::TCPluginCallbacks* context, std::string_view machineType) {
    const NoticeSetting setting{.bootableMedium = IsBootableMedium(),
                                .machineType = machineType,
                                .supervisorAdapter = IPMIselHasTSB2onBoardsmBios()};
    const std::string markup = DriverNoticeMarkup();
    NQORTQR20::fdrShowNotice(context, DriverNoticePlain().c_str(),
                             ShowsLinks(setting) ? markup.c_str() : nullptr);
}

}  // namespace ipmisel
