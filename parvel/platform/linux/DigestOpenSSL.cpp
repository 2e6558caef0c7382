#include "parvel/platform/Digest.h"

#include <openssl/evp.h>

#include <memory>

namespace parvel {
namespace {

struct DigestContextDeleter {
    void operator()(EVP_MD_CTX* context) const { EVP_MD_CTX_free(context); }
};

class RunningDigestOpenSSL final : public Digest::Running {
public:
    explicit RunningDigestOpenSSL(const EVP_MD* algorithm)
        : m_context(EVP_MD_CTX_new()),
          m_isSound(m_context && EVP_DigestInit_ex(m_context.get(), algorithm, nullptr) == 1) {}

    void update(Data::Bytes bytes) override {
        m_isSound = m_isSound && EVP_DigestUpdate(m_context.get(), bytes.data(), bytes.size()) == 1;
    }

    std::optional<Digest::MD5> finish() override {
        Digest::MD5 digest{};
        if (!m_isSound || EVP_DigestFinal_ex(m_context.get(), digest.data(), nullptr) != 1)
            return std::nullopt;
        return digest;
    }

private:
    std::unique_ptr<EVP_MD_CTX, DigestContextDeleter> m_context;
    bool m_isSound;
};

class DigestOpenSSL final : public Digest {
public:
    std::unique_ptr<Running> beginMD5() override {
        if (!m_md5)
            return nullptr;
        return std::make_unique<RunningDigestOpenSSL>(m_md5);
    }

    std::optional<SHA256> sha256(const Data& data) override {
        const std::unique_ptr<EVP_MD_CTX, DigestContextDeleter> context(EVP_MD_CTX_new());
        bool isSound = context && EVP_DigestInit_ex(context.get(), EVP_sha256(), nullptr) == 1;
        for (const Data::Bytes bytes : data.ranges())
            isSound = isSound && EVP_DigestUpdate(context.get(), bytes.data(), bytes.size()) == 1;
        SHA256 digest{};
        if (!isSound || EVP_DigestFinal_ex(context.get(), digest.data(), nullptr) != 1)
            return std::nullopt;
        return digest;
    }

private:
    // Looked up once, which is most of a short digest's cost, and kept for the process's life.
    const EVP_MD* const m_md5 = EVP_MD_fetch(nullptr, "MD5", nullptr);
};

}  // namespace

Digest& Digest::host() {
    static DigestOpenSSL digest;
    return digest;
}

}  // namespace parvel
