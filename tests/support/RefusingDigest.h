#pragma once

#include <memory>
#include <optional>

#include "parvel/platform/Digest.h"
#include "parvel/platform/Service.h"

namespace parvel::testing {

/// A host that refuses every digest, in force while it lives.
class RefusingDigest : public Digest {
public:
    std::unique_ptr<Running> beginMD5() override { return nullptr; }
    std::optional<SHA256> sha256(const Data&) override { return std::nullopt; }

private:
    Service<Digest>::Replacement m_replacement{*this};
};

}  // namespace parvel::testing
