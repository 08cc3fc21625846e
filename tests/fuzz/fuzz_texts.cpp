// The file of numbered texts, and a text of it used as a format.

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>

#include "base/text.h"
#include "plugins/ipmisel/texts/numbered_texts.h"

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string contents(data, data + size);
    constexpr int kValues[] = {-1, 255};
    for (const int number : {1, 347, 1000}) {
        for (const std::size_t capacity : {std::size_t{1}, std::size_t{64}, std::size_t{256}}) {
            const std::string text = ipmisel::FindNumberedText(contents, number, capacity);
            if (text.size() >= capacity) __builtin_trap();
            ipmisel::FormatIntegers(text, kValues, std::size(kValues));
        }
    }
    return 0;
}
