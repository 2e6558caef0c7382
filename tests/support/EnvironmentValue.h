#pragma once

#include <optional>
#include <string>

#include <stdlib.h>

namespace parvel::testing {

/// A variable of the process's environment that has another value while this lives.
class EnvironmentValue {
public:
    EnvironmentValue(std::string name, const std::string& value) : m_name(std::move(name)) {
        if (const char* old = getenv(m_name.c_str()))
            m_old = old;
        setenv(m_name.c_str(), value.c_str(), 1);
    }
    ~EnvironmentValue() {
        if (m_old)
            setenv(m_name.c_str(), m_old->c_str(), 1);
        else
            unsetenv(m_name.c_str());
    }
    EnvironmentValue(const EnvironmentValue&) = delete;
    EnvironmentValue& operator=(const EnvironmentValue&) = delete;

private:
    std::string m_name;
    std::optional<std::string> m_old;
};

}  // namespace parvel::testing
