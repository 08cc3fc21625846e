#include "host/spdriver/lan/crypto.h"

#include <openssl/core_names.h>
#include <openssl/crypto.h>
#include <openssl/evp.h>
#include <openssl/params.h>
#include <sys/random.h>

#include <algorithm>
#include <string>

#include "base/shared_library.h"

namespace tqrhost {
namespace {

// The functions of libcrypto that are used, each by its own name and type.
#define IPMISEL_CRYPTO_FUNCTIONS(use)      \
    use(CRYPTO_memcmp);                    \
    use(OPENSSL_init_crypto);              \
    use(EVP_MAC_fetch);                    \
    use(EVP_MAC_free);                     \
    use(EVP_MAC_CTX_new);                  \
    use(EVP_MAC_CTX_free);                 \
    use(EVP_MAC_init);                     \
    use(EVP_MAC_update);                   \
    use(EVP_MAC_final);                    \
    use(OSSL_PARAM_construct_utf8_string); \
    use(OSSL_PARAM_construct_end);         \
    use(EVP_CIPHER_fetch);                 \
    use(EVP_CIPHER_free);                  \
    use(EVP_CIPHER_CTX_new);               \
    use(EVP_CIPHER_CTX_free);              \
    use(EVP_CIPHER_CTX_set_padding);       \
    use(EVP_CipherInit_ex2);               \
    use(EVP_CipherUpdate)

class Library {
public:
    static const Library& Get() {
        static const Library library;
        return library;
    }
#define IPMISEL_DECLARE(name) decltype(&::name) name
    IPMISEL_CRYPTO_FUNCTIONS(IPMISEL_DECLARE);
#undef IPMISEL_DECLARE

private:
    Library() try {
        const ipmisel::SharedLibrary library("libcrypto.so.3", "OpenSSL 3 (package libssl3)");
#define IPMISEL_FIND(name) library.Find(#name, &(name))
        IPMISEL_CRYPTO_FUNCTIONS(IPMISEL_FIND);
#undef IPMISEL_FIND
        // What stands in openssl.cnf is for programs that speak TLS.
        OPENSSL_init_crypto(OPENSSL_INIT_NO_LOAD_CONFIG | OPENSSL_INIT_NO_ATEXIT, nullptr);
    } catch (const ipmisel::SharedLibraryError& error) {
        throw CryptoError(error.what());
    }
};

void Check(bool good, const char* what) {
    if (!good) throw CryptoError(std::string(what) + " is not to be had from libcrypto");
}

}  // namespace

// --- HMAC -------------------------------------------------------------------------------------

struct Hmac::Context {
    EVP_MAC_CTX* handle = nullptr;
    ~Context() {
        // Without the library there is none, and no exception may leave.
        if (handle != nullptr) Library::Get().EVP_MAC_CTX_free(handle);
    }
};

Hmac::Hmac(Digest digest)
    : context_(std::make_unique<Context>()), length_(digest == Digest::kSha1 ? 20 : 32) {
    const Library& crypto = Library::Get();
    EVP_MAC* const mac = crypto.EVP_MAC_fetch(nullptr, "HMAC", nullptr);
    Check(mac != nullptr, "HMAC");
    context_->handle = crypto.EVP_MAC_CTX_new(mac);
    crypto.EVP_MAC_free(mac);
    Check(context_->handle != nullptr, "HMAC");
    char sha1[] = "SHA1", sha256[] = "SHA256";
    const OSSL_PARAM parameters[] = {
        crypto.OSSL_PARAM_construct_utf8_string(OSSL_MAC_PARAM_DIGEST,
                                                digest == Digest::kSha1 ? sha1 : sha256, 0),
        crypto.OSSL_PARAM_construct_end()};
    const std::uint8_t noKey[1] = {};
    Check(crypto.EVP_MAC_init(context_->handle, noKey, sizeof noKey, parameters) == 1, "HMAC");
}

Hmac::~Hmac() = default;

void Hmac::SetKey(ByteView key) {
    Check(Library::Get().EVP_MAC_init(context_->handle, key.data(), key.size(), nullptr) == 1,
          "HMAC");
}

Hmac::Code Hmac::Compute(std::initializer_list<ByteView> parts) {
    const Library& crypto = Library::Get();
    bool good = crypto.EVP_MAC_init(context_->handle, nullptr, 0, nullptr) == 1;
    for (const ByteView part : parts) {
        good = good && crypto.EVP_MAC_update(context_->handle, part.data(), part.size()) == 1;
    }
    Code code{};
    std::size_t length = 0;
    good = good && crypto.EVP_MAC_final(context_->handle, code.data(), &length, code.size()) == 1;
    Check(good && length == length_, "HMAC");
    return code;
}

// --- AES --------------------------------------------------------------------------------------

struct AesCbc::Context {
    EVP_CIPHER_CTX* handle = nullptr;

    Context(const Block& key, bool encrypt) {
        const Library& crypto = Library::Get();
        EVP_CIPHER* const cipher = crypto.EVP_CIPHER_fetch(nullptr, "AES-128-CBC", nullptr);
        handle = crypto.EVP_CIPHER_CTX_new();
        const bool good = cipher != nullptr && handle != nullptr &&
                          crypto.EVP_CipherInit_ex2(handle, cipher, key.data(), nullptr,
                                                    encrypt ? 1 : 0, nullptr) == 1 &&
                          crypto.EVP_CIPHER_CTX_set_padding(handle, 0) == 1;
        crypto.EVP_CIPHER_free(cipher);
        if (!good) crypto.EVP_CIPHER_CTX_free(handle);
        Check(good, "AES");
    }
    ~Context() {
        if (handle != nullptr) Library::Get().EVP_CIPHER_CTX_free(handle);
    }
    Context(const Context&) = delete;
    Context& operator=(const Context&) = delete;

    void Run(std::span<const std::uint8_t, kBlock> initial, ByteView in,
             std::span<std::uint8_t> out) {
        const Library& crypto = Library::Get();
        int length = 0;
        constexpr int kAsBefore = -1;
        Check(in.size() % kBlock == 0 && out.size() == in.size() &&
                  crypto.EVP_CipherInit_ex2(handle, nullptr, nullptr, initial.data(), kAsBefore,
                                            nullptr) == 1 &&
                  crypto.EVP_CipherUpdate(handle, out.data(), &length, in.data(),
                                          static_cast<int>(in.size())) == 1 &&
                  length == static_cast<int>(in.size()),
              "AES");
    }
};

AesCbc::AesCbc(const Block& key)
    : encrypt_(std::make_unique<Context>(key, true)),
      decrypt_(std::make_unique<Context>(key, false)) {}
AesCbc::~AesCbc() = default;

void AesCbc::Encrypt(std::span<const std::uint8_t, kBlock> initial, ByteView in,
                     std::span<std::uint8_t> out) {
    encrypt_->Run(initial, in, out);
}
void AesCbc::Decrypt(std::span<const std::uint8_t, kBlock> initial, ByteView in,
                     std::span<std::uint8_t> out) {
    decrypt_->Run(initial, in, out);
}

// --- Small things -----------------------------------------------------------------------------

bool EqualInConstantTime(ByteView one, ByteView other) {
    return one.size() == other.size() &&
           Library::Get().CRYPTO_memcmp(one.data(), other.data(), one.size()) == 0;
}

void Wipe(std::span<std::uint8_t> bytes) {
    // Nothing has no address.
    if (!bytes.empty()) explicit_bzero(bytes.data(), bytes.size());
}

void RandomSource::Fill(std::span<std::uint8_t> bytes) {
    if (bytes.size() > pool_.size() - used_) {
        // Up to 256 bytes come whole (getrandom(2)), more may be cut by a signal.
        for (std::size_t have = 0; have < pool_.size();) {
            const std::size_t wanted = std::min<std::size_t>(256, pool_.size() - have);
            const ssize_t got = getrandom(pool_.data() + have, wanted, 0);
            if (got < 0 && errno == EINTR) continue;
            if (got <= 0) throw CryptoError("the system gives no random numbers");
            have += static_cast<std::size_t>(got);
        }
        used_ = 0;
    }
    if (bytes.size() > pool_.size()) throw CryptoError("too many random numbers at a time");
    const auto from = std::span(pool_).subspan(used_, bytes.size());
    std::copy(from.begin(), from.end(), bytes.begin());
    Wipe(from);
    used_ += bytes.size();
}

}  // namespace tqrhost
