#include "collector/collect.h"

int main(int argc, char** argv) {
    int exitStatus = 0;
    const auto options = ipmisel::ParseOptions(argc, argv, &exitStatus);
    if (!options) return exitStatus;
    return options->command == ipmisel::Options::Command::kClasses ? ipmisel::ListClasses()
                                                                   : ipmisel::Collect(*options);
}
