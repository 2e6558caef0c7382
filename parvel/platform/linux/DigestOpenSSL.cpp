#include "parvel/platform/linux/DigestOpenSSL.h"

#include <atomic>

namespace parvel {
namespace {

using host::Libcrypto;

struct DigestContextDeleter {
    const Libcrypto& libcrypto;
    void operator()(EVP_MD_CTX* context) const { libcrypto.EVP_MD_CTX_free(context); }
};
using DigestContext = std::unique_ptr<EVP_MD_CTX, DigestContextDeleter>;

DigestContext startedDigest(const Libcrypto& libcrypto, const EVP_MD* algorithm) {
    DigestContext context(libcrypto.EVP_MD_CTX_new(), DigestContextDeleter{libcrypto});
    if (context && libcrypto.EVP_DigestInit_ex(context.get(), algorithm, nullptr) != 1)
        context.reset();
    return context;
}

class RunningDigestOpenSSL final : public Digest::Running {
public:
    RunningDigestOpenSSL(const Libcrypto& libcrypto, const EVP_MD* algorithm)
        : m_libcrypto(libcrypto),
          m_context(startedDigest(libcrypto, algorithm)),
          m_isSound(m_context != nullptr) {}

    void update(Data::Bytes bytes) override {
        m_isSound = m_isSound &&
                    m_libcrypto.EVP_DigestUpdate(m_context.get(), bytes.data(), bytes.size()) == 1;
    }

    std::optional<Digest::MD5> finish() override {
        Digest::MD5 digest{};
        if (!m_isSound ||
            m_libcrypto.EVP_DigestFinal_ex(m_context.get(), digest.data(), nullptr) != 1)
            return std::nullopt;
        return digest;
    }

private:
    const Libcrypto& m_libcrypto;
    const DigestContext m_context;
    bool m_isSound;
};

class DigestOpenSSL final : public Digest {
public:
    explicit DigestOpenSSL(const Libcrypto& (*libcrypto)()) : m_libcrypto(libcrypto) {}

    std::unique_ptr<Running> beginMD5() override {
        const Libcrypto& libcrypto = m_libcrypto();
        const EVP_MD* algorithm = libcrypto.isComplete() ? md5(libcrypto) : nullptr;
        if (!algorithm)
            return nullptr;
        return std::make_unique<RunningDigestOpenSSL>(libcrypto, algorithm);
    }

    std::optional<SHA256> sha256(const Data& data) override {
        const Libcrypto& libcrypto = m_libcrypto();
        if (!libcrypto.isComplete())
            return std::nullopt;
        const DigestContext context = startedDigest(libcrypto, libcrypto.EVP_sha256());
        bool isSound = context != nullptr;
        for (const Data::Bytes bytes : data.ranges())
            isSound = isSound &&
                      libcrypto.EVP_DigestUpdate(context.get(), bytes.data(), bytes.size()) == 1;
        SHA256 digest{};
        if (!isSound || libcrypto.EVP_DigestFinal_ex(context.get(), digest.data(), nullptr) != 1)
            return std::nullopt;
        return digest;
    }

private:
    /// Looked up once, which is most of a short digest's cost, and kept for the process's life.
    const EVP_MD* md5(const Libcrypto& libcrypto) {
        const EVP_MD* algorithm = m_md5.load(std::memory_order_acquire);
        if (!algorithm) {
            algorithm = libcrypto.EVP_MD_fetch(nullptr, "MD5", nullptr);
            m_md5.store(algorithm, std::memory_order_release);
        }
        return algorithm;
    }

    const Libcrypto& (*const m_libcrypto)();
    std::atomic<const EVP_MD*> m_md5{nullptr};
};

}  // namespace

std::unique_ptr<Digest> makeDigestOpenSSL(const Libcrypto& (*libcrypto)()) {
    return std::make_unique<DigestOpenSSL>(libcrypto);
}

Digest& Digest::host() {
    static DigestOpenSSL digest(Libcrypto::host);
    return digest;
}

}  // namespace parvel
