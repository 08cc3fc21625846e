#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <memory>
#include <span>
#include <stdexcept>

// What a session needs of OpenSSL's libcrypto 3, which is loaded when the first object is made: a
// run that reaches no BMC over the network does without it. Handles are kept, so that a packet
// costs no allocation of ours. Nothing here may be shared between threads.

namespace tqrhost {

using ByteView = std::span<const std::uint8_t>;

/// libcrypto cannot be loaded or refuses an algorithm; what() says which and what to do.
struct CryptoError : std::runtime_error {
    using std::runtime_error::runtime_error;
};

/// HMAC (RFC 2104) with a key that is kept.
class Hmac {
public:
    enum class Digest { kSha1, kSha256 };
    static constexpr std::size_t kMaxLength = 32;
    using Code = std::array<std::uint8_t, kMaxLength>;  ///< the first length() bytes count

    /// Throws CryptoError, as every operation here.
    explicit Hmac(Digest digest);
    ~Hmac();
    Hmac(const Hmac&) = delete;
    Hmac& operator=(const Hmac&) = delete;

    std::size_t length() const { return length_; }
    /// At least one byte.
    void SetKey(ByteView key);
    /// Of the parts, one behind the other; a key has been set.
    Code Compute(std::initializer_list<ByteView> parts);

private:
    struct Context;
    std::unique_ptr<Context> context_;
    std::size_t length_;
};

/// AES-128 in cipher block chaining mode, without padding.
class AesCbc {
public:
    static constexpr std::size_t kBlock = 16;
    using Block = std::array<std::uint8_t, kBlock>;

    explicit AesCbc(const Block& key);
    ~AesCbc();
    AesCbc(const AesCbc&) = delete;
    AesCbc& operator=(const AesCbc&) = delete;

    /// `in` is whole blocks and `out` as long; they may be the same bytes.
    void Encrypt(std::span<const std::uint8_t, kBlock> initial, ByteView in,
                 std::span<std::uint8_t> out);
    void Decrypt(std::span<const std::uint8_t, kBlock> initial, ByteView in,
                 std::span<std::uint8_t> out);

private:
    struct Context;
    std::unique_ptr<Context> encrypt_;
    std::unique_ptr<Context> decrypt_;
};

/// Takes as long whether and wherever they differ. False for different lengths.
bool EqualInConstantTime(ByteView one, ByteView other);

/// Clears bytes in a way that the compiler does not leave out.
void Wipe(std::span<std::uint8_t> bytes);

/// Random bytes of the system, fetched some hundred at a time. Throws CryptoError.
class RandomSource {
public:
    ~RandomSource() { Wipe(pool_); }
    void Fill(std::span<std::uint8_t> bytes);

private:
    std::array<std::uint8_t, 512> pool_{};
    std::size_t used_ = sizeof(pool_);
};

}  // namespace tqrhost
