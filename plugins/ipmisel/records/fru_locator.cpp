#include "plugins/ipmisel/records/fru_locator.h"

#include <algorithm>
#include <string_view>

namespace {

// 72 allowed bytes, in the order of the list.
constexpr std::string_view kValidFruBytes =
    " ()-./0123456789ABCDEFGHIJKLMNOPQRSTUVWXYZ[\\]_abcdefghijklmnopqrstuvwxyz";
static_assert(kValidFruBytes.size() == 72);

// The fixed layout: offsets from the marker, in the order in which the export reads them.
constexpr std::array<std::uint8_t, 3> kLayoutMarker{0x01, 0x25, 0x00};
constexpr std::array<int, 5> kLayoutOffsets{134, 7, 38, 71, 102};

constexpr int kBoardInfoLength = 30;

}  // namespace

void IPMIFRULocator::SetFRUData(int offset, const unsigned char* bytes, unsigned int count) {
    if (bytes == nullptr || offset < 0 || offset >= static_cast<int>(kFruDataLength)) return;
    const auto room = kFruDataLength - static_cast<unsigned>(offset);
    std::copy_n(bytes, std::min(count, room), fruData_.begin() + offset);
}

void IPMIFRULocator::InitValidFRUByteList(std::vector<char>& list) {
    list.assign(kValidFruBytes.begin(), kValidFruBytes.end());
}

bool IPMIFRULocator::IsValidFRUByte(char byte) {
    return kValidFruBytes.find(byte) != std::string_view::npos;
}

bool IPMIFRULocator::IsValidFRUData(const std::string& text) {
    if (text.size() < 2) return false;
    // npos is greater than every position: a missing bracket stands after everything. "]" without
    // "[" fails, and so does ")" without "(".
    return text.find('[') <= text.find(']') && text.find('(') <= text.find(')');
}

std::string IPMIFRULocator::GetBoardInfo(int base, int offset) const {
    std::string text;
    for (int i = 0; i < kBoardInfoLength; ++i) {
        const long long index = static_cast<long long>(base) + offset + i;
        if (index < 0 || index >= static_cast<long long>(kFruDataLength)) break;
        const auto byte = static_cast<char>(fruData_[static_cast<std::size_t>(index)]);
        if (byte == 0 || !IsValidFRUByte(byte)) break;
        text += byte;
    }
    return text;
}

void IPMIFRULocator::GetFRUDataString(std::vector<std::string>& strings) const {
    strings.clear();
    const auto marker =
        std::search(fruData_.begin(), fruData_.end(), kLayoutMarker.begin(), kLayoutMarker.end());
    if (marker != fruData_.end()) {
        const auto at = static_cast<int>(marker - fruData_.begin());
        strings.emplace_back("No chassis part number");
        for (const int offset : kLayoutOffsets) strings.push_back(GetBoardInfo(offset, at));
        return;
    }
    std::string run;
    for (const std::uint8_t byte : fruData_) {
        const auto character = static_cast<char>(byte);
        if (IsValidFRUByte(character)) {
            run += character;
            continue;
        }
        if (IsValidFRUData(run)) strings.push_back(run);
        run.clear();
    }
    // Compatibility: a run that the end of the data cuts is judged by its length alone
    // (FruLocator.RunAtTheEndIsKeptWithoutBracketTests).
    if (run.size() > 1) strings.push_back(run);
}
