#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "tqr/plugin.h"

// Numbered texts: lines "number=text" of the file "ipmisel.INI" beside the plug-in.

namespace ipmisel {

/// Room that the decoders give a numbered text, its final NUL included.
constexpr std::size_t kTextCapacity = 256;
/// Bytes that the file may have; a larger one is none of ours.
constexpr std::size_t kMaxTextFile = (1 << 17) - 1;

/// The text of a number in the contents of the file, as it comes out of a buffer of `capacity`
/// bytes. Empty when no line has the number.
std::string FindNumberedText(std::string_view contents, int number, std::size_t capacity);

/// As FindNumberedText, from the file, which is read anew on every call. Nothing when there is no
/// text, which has then been logged.
std::optional<std::string> NumberedText(NQORTQR20::TCPluginCallbacks* context, int number,
                                        std::size_t capacity);

/// As NumberedText; a failure is logged as one of the decoder's too, and gives an empty text.
std::string FetchText(NQORTQR20::TCPluginCallbacks* context, int number,
                      std::size_t capacity = kTextCapacity);

}  // namespace ipmisel
