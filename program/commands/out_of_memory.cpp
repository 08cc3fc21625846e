#include "program/commands/out_of_memory.h"

#include <unistd.h>

#include <atomic>
#include <cstddef>
#include <cstdlib>
#include <exception>
#include <new>
#include <string_view>

#include "program/commands/failure.h"

namespace ipmisel {
namespace {

// Given back at the first failure: a JSON value takes memory to be destroyed, and cannot fail then.
constexpr std::size_t kReserve = 8 << 20;
std::atomic<void*> gReserve = nullptr;
std::atomic<bool> gHasRunOut = false;
std::atomic<bool> gParentTells = false;

void GiveReserveBack() {
    gHasRunOut = true;
    std::free(gReserve.exchange(nullptr));
    throw std::bad_alloc();
}

/// Where the reserve was not enough, or is used up.
[[noreturn]] void EndTheProgram() {
    try {
        if (const auto error = std::current_exception()) std::rethrow_exception(error);
    } catch (const std::bad_alloc&) {
        if (gParentTells) std::_Exit(kExitNoSource);
        for (const std::string_view part :
             {"ipmisel: ", kOutOfMemory, "; ", kOutOfMemoryAdvice, "\n"}) {
            if (write(STDERR_FILENO, part.data(), part.size()) < 0) break;
        }
        std::_Exit(kExitNoSource);  // of check: unknown
    } catch (...) {
    }
    std::abort();
}

}  // namespace

void PrepareForOutOfMemory() {
    if (gReserve == nullptr) gReserve = std::malloc(kReserve);
    std::set_new_handler(GiveReserveBack);
    std::set_terminate(EndTheProgram);
}

void LeaveOutOfMemoryToTheParent() { gParentTells = true; }

bool HasRunOutOfMemory() { return gHasRunOut; }

}  // namespace ipmisel
