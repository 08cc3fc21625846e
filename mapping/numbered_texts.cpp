#include "mapping/numbered_texts.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <span>
#include <utility>

#include "base/log.h"
#include "base/text.h"

namespace ipmisel {
namespace {

// A longer line is read in pieces, each a line of its own.
constexpr std::size_t kLongestPiece = 511;
constexpr off_t kLargestFile = 16 << 20;  // far beyond any real one

/// Reads until the span is full or the file ends; the number of bytes read.
std::size_t ReadAll(int file, std::span<char> room) {
    std::size_t have = 0;
    while (have < room.size()) {
        const ssize_t count = read(file, room.data() + have, room.size() - have);
        if (count < 0 && errno == EINTR) continue;
        if (count <= 0) break;
        have += static_cast<std::size_t>(count);
    }
    return have;
}

/// Nothing when the file cannot be opened or is no plain file of a sensible size.
std::optional<std::string> ReadTextFile(const std::string& path) {
    // Not blocking: a pipe in the file's place must not hold the collection up.
    const int file = open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
    if (file < 0) return std::nullopt;
    std::optional<std::string> contents;
    struct stat facts {};
    if (fstat(file, &facts) == 0 && S_ISREG(facts.st_mode) && facts.st_size <= kLargestFile) {
        std::string text(static_cast<std::size_t>(facts.st_size), '\0');
        text.resize(ReadAll(file, text));
        contents = std::move(text);
    }
    close(file);
    return contents;
}

/// The first piece that shows `key`. A NUL hides the rest of its piece.
std::string_view FindPiece(std::string_view contents, std::string_view key) {
    std::size_t lineStart = 0;
    std::size_t searched = 0;
    while (true) {
        const std::size_t at = contents.find(key, searched);
        if (at == std::string_view::npos) return {};
        const std::size_t lineFeed = contents.substr(searched, at - searched).rfind('\n');
        if (lineFeed != std::string_view::npos) lineStart = searched + lineFeed + 1;

        const std::size_t start = at - (at - lineStart) % kLongestPiece;
        std::string_view piece = contents.substr(start, kLongestPiece);
        piece = piece.substr(0, piece.find('\0'));
        // A line feed is the last character of its piece; the key holds none.
        if (const auto end = piece.find('\n'); end != std::string_view::npos) {
            piece = piece.substr(0, end + 1);
        }
        if (at - start + key.size() <= piece.size()) return piece;
        searched = at + 1;
    }
}

}  // namespace

std::string FindNumberedText(std::string_view contents, int number, std::size_t capacity) {
    // Compatibility: the key counts anywhere in a line, so that 5 may find the line of 105
    // (NumberedTexts.LookupRules).
    const std::string_view piece = FindPiece(contents, std::to_string(number) + "=");
    if (piece.empty() || capacity == 0) return {};
    std::string_view text = piece.substr(piece.find('=') + 1).substr(0, capacity - 1);
    // Compatibility: without a line end it is the last character that goes
    // (NumberedTexts.LookupRules).
    if (text.ends_with("\r\n")) {
        text.remove_suffix(2);
    } else if (!text.empty()) {
        text.remove_suffix(1);
    }
    return std::string(text);
}

std::optional<std::string> NumberedText(NQORTQR20::TCPluginCallbacks* context, int number,
                                        std::size_t capacity) {
    const char* pluginPath = nullptr;
    if (NQORTQR20::fdrGetPluginPath(context, &pluginPath).code != NQORTQR20::kStatusOk ||
        pluginPath == nullptr) {
        WriteLog(kError, "fdrGetPluginPath failed.");
        return std::nullopt;
    }
    std::string path(pluginPath);
    // The last one: the tree that the plug-in stands in may have the word in its own path.
    const std::size_t name = path.rfind("ipmisel");
    if (name == std::string::npos) {
        WriteLog(kWarning, "Path not found for ipmisel INI file.");
        return std::nullopt;
    }
    path.replace(name, std::string::npos, "ipmisel.INI");
    if (LogEnabled(kInfo)) WriteLog(kInfo, "Path found for ipmisel INI file: " + path);

    const std::optional<std::string> contents = ReadTextFile(path);
    if (!contents) {
        WriteLog(kWarning, Format("Could not open file %s. Did not obtain string #%d\n",
                                  path.c_str(), number));
        return std::nullopt;
    }
    std::string text = FindNumberedText(*contents, number, capacity);
    if (text.empty()) {
        WriteLog(kError, Format("Could not find data_number %d", number));
        return std::nullopt;
    }
    return text;
}

std::string FetchText(NQORTQR20::TCPluginCallbacks* context, int number, std::size_t capacity) {
    std::optional<std::string> text = NumberedText(context, number, capacity);
    if (text) return *std::move(text);
    WriteLog(kError, "Error in obtaining string.");
    return {};
}

}  // namespace ipmisel
