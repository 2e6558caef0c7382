#pragma once

#include <chrono>
#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "parvel/platform/linux/cloud/HostCloudStore.h"
#include "tests/support/EnvironmentValue.h"
#include "tests/support/StandInServer.h"
#include "tests/support/TemporaryDirectory.h"

namespace parvel::testing {

/// One side of an item in the index: `set` is the one of its flags deleted, ignored and invalid
/// that is true, if any.
inline std::string sideJson(const std::string& counters, const std::string& set = "") {
    const auto flag = [&set](const std::string& name) {
        return "\"" + name + "\": " + (name == set ? "true" : "false");
    };
    return "{" + flag("deleted") + "," + flag("ignored") + "," + flag("invalid") +
           ", \"version\": " + counters + "}";
}

inline std::string indexJson(const std::string& local, const std::string& global) {
    return "{\"availability\": [], \"global\": " + global + ", \"local\": " + local + "}";
}

inline std::string neededJson(const std::vector<std::string>& names, bool deleted = false) {
    std::string items;
    for (const std::string& name : names)
        items += std::string(items.empty() ? "" : ",") + "{\"name\": \"" + name +
                 "\", \"deleted\": " + (deleted ? "true" : "false") + "}";
    return "{\"page\": 1, \"progress\": [], \"queued\": [" + items + "], \"rest\": []}";
}

inline std::string okReply(const std::string& body) {
    return "HTTP/1.0 200 OK\r\nContent-Type: application/json\r\nContent-Length: " +
           std::to_string(body.size()) + "\r\n\r\n" + body;
}

/// Versions of an item, and an index whose two sides have the same one.
inline const std::string kOne = "[\"ABC:1\"]";
inline const std::string kTwo = "[\"ABC:1\", \"DEF:7\"]";
inline const std::string kInStep = indexJson(sideJson(kOne), sideJson(kOne));

/// A root with Syncthing's mark, whose REST interface a stand-in serves.
class SyncthingRoot : public ::testing::Test {
protected:
    SyncthingRoot() {
        m_folder.write("root/.stfolder/x", "");
        m_folder.write("root/a.epub", "content");
    }

    /// The configuration names the stand-in's address, unless another is given.
    void configure(const std::string& address = "", const std::string& guiAttributes = "") {
        m_folder.write(
            "config/syncthing/config.xml",
            "<configuration version=\"36\"><folder id=\"other\" path=\"/nowhere\"/>" +
                ("<folder id=\"my books\" path=\"" + m_path + "\"/>") + "<gui enabled=\"true\" " +
                guiAttributes + "><address>" +
                (address.empty() ? "127.0.0.1:" + std::to_string(m_server->port()) : address) +
                "</address><apikey>" + m_apiKey + "</apikey></gui></configuration>");
    }
    void serveRaw(StandInServer::Serve serve) {
        m_server.emplace(std::move(serve));
        configure();
    }
    /// Gives each request its reply, by the start of the resource that it asks for.
    void serve(std::map<std::string, std::string> replies) {
        serveRaw([this, replies = std::move(replies)](StandInConnection& connection) {
            std::string request;
            connection.readLine(request);
            std::string header;
            for (std::string line; connection.readLine(line) && line != "\r";)
                header += line;
            {
                const std::lock_guard lock(m_mutex);
                m_requests.push_back(request.substr(0, request.find_last_of(' ')));
                m_header = header;
            }
            for (const auto& [start, reply] : replies)
                if (request.starts_with("GET " + start))
                    connection.send(reply);
        });
    }
    std::vector<std::string> requests() {
        const std::lock_guard lock(m_mutex);
        return m_requests;
    }
    std::string header() {
        const std::lock_guard lock(m_mutex);
        return m_header;
    }
    void serveFile(const std::string& body) { serve({{"/rest/db/file", okReply(body)}}); }

    std::optional<DownloadingStatus> status(std::string_view name = "root/a.epub") {
        std::optional<DownloadingStatus> result = DownloadingStatus::NotDownloaded;
        const auto begin = std::chrono::steady_clock::now();
        EXPECT_TRUE(m_store.downloadingStatus(m_folder.url(name), result, nullptr));
        m_took =
            std::chrono::ceil<std::chrono::milliseconds>(std::chrono::steady_clock::now() - begin);
        return result;
    }
    std::string reason(std::string_view name = "root/a.epub") {
        return m_store.report(m_folder.url(name), nullptr).value().reason;
    }

    TemporaryDirectory m_folder;
    EnvironmentValue m_state{"XDG_STATE_HOME", m_folder / "state"};
    EnvironmentValue m_config{"XDG_CONFIG_HOME", m_folder / "config"};
    std::string m_path = m_folder / "root";
    std::string m_apiKey = "key-123";
    host::HostCloudStore m_store{
        host::CloudWaits{std::chrono::milliseconds(400), std::chrono::milliseconds(0),
                         std::chrono::milliseconds(1500), std::chrono::milliseconds(60'000)}};
    std::chrono::milliseconds m_took{0};
    std::mutex m_mutex;  ///< of the next two
    std::vector<std::string> m_requests;
    std::string m_header;
    std::optional<StandInServer> m_server;
};

}  // namespace parvel::testing
