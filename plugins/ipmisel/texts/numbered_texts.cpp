#include "plugins/ipmisel/texts/numbered_texts.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
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

/// A small text file; larger ones are none of ours.
class TextFile {
public:
    explicit TextFile(const std::string& path)
        // Not blocking: a pipe in the file's place must not hold the collection up.
        : file_(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK)) {}
    TextFile(const TextFile&) = delete;
    TextFile& operator=(const TextFile&) = delete;
    ~TextFile() {
        if (file_ >= 0) close(file_);
    }

    /// The first `most` bytes, or as many as there are, until it is read again. Nothing when the
    /// file cannot be read or is too large.
    std::optional<std::string_view> Read(std::size_t most = kMaxTextFile + 1) {
        if (file_ < 0) return std::nullopt;
        ssize_t count = 0;
        do {
            count = read(file_, room_.data(), std::min(most, room_.size()));
        } while (count < 0 && errno == EINTR);
        // Only its end cuts a plain file short.
        if (count < 0 || static_cast<std::size_t>(count) == room_.size()) return std::nullopt;
        return std::string_view(room_.data(), static_cast<std::size_t>(count));
    }

    /// All of it, from its start.
    std::optional<std::string_view> ReadAgain() {
        if (lseek(file_, 0, SEEK_SET) != 0) return std::nullopt;
        return Read();
    }

private:
    int file_;
    // Not set to zero: every text of every record comes through here.
    std::array<char, kMaxTextFile + 1> room_;
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

/// The text of a piece, as it comes out of a buffer of `capacity` bytes.
std::string TextOf(std::string_view piece, std::size_t capacity) {
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

/// The first piece with a number.
std::string_view FindNumber(std::string_view contents, int number) {
    // Compatibility: the key counts anywhere in a line, so that 5 may find the line of 105
    // (NumberedTexts.LookupRules).
    return FindPiece(contents, std::to_string(number) + "=");
}

/// What was found in the file, for as long as the bytes that are read are the same.
class FoundTexts {
public:
    /// Empty when no line has the number; nothing when the file cannot be read.
    std::optional<std::string_view> Find(TextFile& file, int number, std::size_t capacity) {
        auto found = texts_.find({number, capacity});
        const std::size_t needed = found == texts_.end() ? kMaxTextFile + 1 : found->second.end + 1;
        std::optional<std::string_view> read = file.Read(needed);
        if (read && *read != std::string_view(contents_).substr(0, needed)) {
            if (found != texts_.end()) read = file.ReadAgain();
            texts_.clear();
            found = texts_.end();
        }
        if (!read) return std::nullopt;
        if (found == texts_.end()) {
            contents_ = *read;
            const std::string_view piece = FindNumber(*read, number);
            const std::size_t end =
                piece.empty() ? read->size() : piece.data() + piece.size() - read->data();
            found = texts_.insert({{number, capacity}, {TextOf(piece, capacity), end}}).first;
        }
        return found->second.text;
    }

private:
    struct Text {
        std::string text;
        std::size_t end;  ///< of its piece: what stands behind it has no part in it
    };
    std::string contents_;
    std::map<std::pair<int, std::size_t>, Text> texts_;
};

}  // namespace

std::string FindNumberedText(std::string_view contents, int number, std::size_t capacity) {
    return TextOf(FindNumber(contents, number), capacity);
}

std::optional<std::string> NumberedText(NQORTQR20::TCPluginCallbacks* context, int number,
                                        std::size_t capacity) {
    const char* pluginPath = nullptr;
    if (NQORTQR20::fdrGetPluginPath(context, &pluginPath).code != NQORTQR20::kStatusOk) {
        WriteLog(kError, "fdrGetPluginPath failed.");
        return std::nullopt;
    }
    std::string path(pluginPath == nullptr ? "" : pluginPath);
    // The last one: the tree that the plug-in stands in may have the word in its own path.
    const std::size_t name = path.rfind("ipmisel");
    if (name == std::string::npos) {
        WriteLog(kWarning, "Path not found for ipmisel INI file.");
        return std::nullopt;
    }
    path.replace(name, std::string::npos, "ipmisel.INI");
    if (LogEnabled(kInfo)) WriteLog(kInfo, "Path found for ipmisel INI file: " + path);

    TextFile file(path);
    static thread_local FoundTexts found;
    const std::optional<std::string_view> text = found.Find(file, number, capacity);
    if (!text) {
        WriteLog(kWarning, Format("Could not open file %s. Did not obtain string #%d\n",
                                  path.c_str(), number));
        return std::nullopt;
    }
    if (text->empty()) {
        WriteLog(kError, Format("Could not find data_number %d", number));
        return std::nullopt;
    }
    return std::string(*text);
}

std::string FetchText(NQORTQR20::TCPluginCallbacks* context, int number, std::size_t capacity) {
    std::optional<std::string> text = NumberedText(context, number, capacity);
    if (text) return *std::move(text);
    WriteLog(kError, "Error in obtaining string.");
    return {};
}

}  // namespace ipmisel
