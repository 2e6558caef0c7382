#pragma once

#include <functional>
#include <utility>

#include "parvel/platform/CopyService.h"
#include "parvel/platform/Service.h"

namespace parvel::testing {

/// A copy service that makes the reports and gives the result that a test wants, in force while it
/// lives. Nothing is copied.
class ScriptedCopyService : public CopyService {
public:
    using Script = std::function<int(const StatusCallback& callback)>;

    explicit ScriptedCopyService(Script script) : m_script(std::move(script)) {}

    int copy(const std::string&, const std::string&, const StatusCallback& callback) override {
        return m_script(callback);
    }

private:
    Script m_script;
    Service<CopyService>::Replacement m_replacement{*this};
};

}  // namespace parvel::testing
