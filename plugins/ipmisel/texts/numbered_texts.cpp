#include "plugins/ipmisel/texts/numbered_texts.h"

#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <map>
#include <utility>

#include "base/text.h"
#include "plugins/ipmisel/log.h"

namespace ipmisel {
namespace {

// A longer line is read in pieces, each a line of its own.
constexpr std::size_t kLongestPiece = 511;

/// A small text file, read whole; larger ones are none of ours.
class TextFile {
public:
    explicit TextFile(const std::string& path) {
        // Not blocking: a pipe in the file's place must not hold the collection up.
        const int file = open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK);
        if (file < 0) return;
        read_ = ReadAll(file);
        close(file);
    }
    /// Nothing when the file cannot be read or is too large.
    std::optional<std::string_view> Contents() const {
        if (!read_) return std::nullopt;
        return std::string_view(room_.data(), have_);
    }

private:
    bool ReadAll(int file) {
        ssize_t count = 0;
        do {
            count = read(file, room_.data(), room_.size());
        } while (count < 0 && errno == EINTR);
        if (count < 0) return false;
        have_ = static_cast<std::size_t>(count);  // all of it: only its end cuts a plain file short
        return have_ < room_.size();
    }

    // Not set to zero: every text of every record comes through here.
    std::array<char, kMaxTextFile + 1> room_;
    std::size_t have_ = 0;
    bool read_ = false;
};

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

/// What was found in the file, for as long as the bytes that are read are the same.
class FoundTexts {
public:
    const std::string& Find(std::string_view contents, int number, std::size_t capacity) {
        if (contents != contents_) {
            contents_ = contents;
            texts_.clear();
        }
        const auto [at, isNew] = texts_.try_emplace({number, capacity});
        if (isNew) at->second = FindNumberedText(contents, number, capacity);
        return at->second;
    }

private:
    std::string contents_;
    std::map<std::pair<int, std::size_t>, std::string> texts_;
};

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

    const TextFile file(path);
    const std::optional<std::string_view> contents = file.Contents();
    if (!contents) {
        WriteLog(kWarning, Format("Could not open file %s. Did not obtain string #%d\n",
                                  path.c_str(), number));
        return std::nullopt;
    }
    static thread_local FoundTexts found;
    const std::string& text = found.Find(*contents, number, capacity);
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
