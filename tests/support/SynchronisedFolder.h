#pragma once

#include "tests/support/EnvironmentValue.h"
#include "tests/support/ManagedFolder.h"

namespace parvel::testing {

/// A folder "cloud" that a client synchronises, by its mark on disk, beside a folder that none
/// does.
class SynchronisedFolder : public ManagedFolder {
protected:
    SynchronisedFolder() { makeFolder("cloud/.stfolder"); }

    [[nodiscard]] URL cloud() const { return m_folder.url("cloud"); }
    [[nodiscard]] URL inCloud(const std::string& name) const {
        return m_folder.url("cloud/" + name);
    }
    [[nodiscard]] Names booksInCloud() const {
        Names all = names("cloud");
        std::erase(all, ".stfolder");
        return all;
    }

private:
    TemporaryDirectory m_locks;
    EnvironmentValue m_runtime{"XDG_RUNTIME_DIR", m_locks.path().string()};
};

}  // namespace parvel::testing
