#pragma once

#include <functional>
#include <memory>
#include <string>

#include "parvel/platform/ArchiveCopier.h"
#include "parvel/platform/Service.h"

namespace parvel::testing {

/// A copier that counts what a test wants and does in a copy what it is told to.
class ScriptedArchiveCopier : public ArchiveCopier {
public:
    void setCallbacks(ArchiveCopierCallbacks* given) override { callbacks = given; }
    Count countTree(const std::string&) override { return count; }
    Count countArchive(const std::string&) override { return count; }
    int copy(const std::string&, const std::string& destination, const Dictionary& given) override {
        copiedTo = destination;
        options = given;
        return script ? script() : 0;
    }
    void cancel() override {
        if (onCancel)
            onCancel();
    }

    Count count;
    std::function<int()> script;
    std::function<void()> onCancel;
    ArchiveCopierCallbacks* callbacks = nullptr;
    std::string copiedTo;
    Dictionary options;
};

/// Hands that copier to whoever makes one, in force while it lives.
class ScriptedArchiveCopierFactory : public ArchiveCopierFactory {
public:
    std::shared_ptr<ArchiveCopier> makeCopier() override { return copier; }

    std::shared_ptr<ScriptedArchiveCopier> copier = std::make_shared<ScriptedArchiveCopier>();

private:
    Service<ArchiveCopierFactory>::Replacement m_replacement{*this};
};

}  // namespace parvel::testing
