#include "program/reports/digest.h"

#include <openssl/evp.h>

#include <array>
#include <new>

namespace ipmisel {

std::string Base64(std::span<const std::uint8_t> bytes) {
    std::string text((bytes.size() + 2) / 3 * 4 + 1, '\0');  // a NUL is written behind it
    const int length = EVP_EncodeBlock(reinterpret_cast<unsigned char*>(text.data()), bytes.data(),
                                       static_cast<int>(bytes.size()));
    text.resize(static_cast<std::size_t>(length));
    return text;
}

std::string Sha256Base64(std::string_view text) {
    std::array<std::uint8_t, 32> digest{};
    if (EVP_Digest(text.data(), text.size(), digest.data(), nullptr, EVP_sha256(), nullptr) != 1) {
        throw std::bad_alloc();
    }
    return Base64(digest);
}

}  // namespace ipmisel
