#include "parvel/platform/linux/cloud/SyncthingClient.h"

#include <algorithm>
#include <charconv>
#include <optional>
#include <thread>

#include "parvel/foundation/Value.h"
#include "parvel/platform/linux/cloud/JsonText.h"
#include "parvel/platform/linux/cloud/SyncthingConfig.h"

namespace parvel::host {

namespace {

constexpr std::size_t kLongestReply = 4U << 20;
/// Items that one page of what is needed lists, about 600 bytes each.
constexpr std::size_t kPageSize = 1000;
/// In a folder that needs more, no package is said to be all here.
constexpr int kMostPages = 20;
constexpr std::chrono::milliseconds kLook{200};

constexpr ClientAnswer kNotUnderstood{ClientWord::Unclear, "the client's answer is not understood"};

struct Reply {
    SocketOutcome outcome;
    int status = 0;
    std::string body;
};

/// Takes a whole reply apart: the body of status 200 is as long as its header says, where it does.
Reply parsedReply(std::string_view bytes) {
    constexpr std::string_view lengthField = "\r\ncontent-length:";
    Reply reply{SocketOutcome::Done, 0, {}};
    const std::size_t headerEnd = bytes.find("\r\n\r\n");
    if (headerEnd == bytes.npos || bytes.size() < 12 || !bytes.starts_with("HTTP/1."))
        return reply;
    std::from_chars(bytes.data() + 9, bytes.data() + 12, reply.status);
    const std::string_view header = bytes.substr(0, headerEnd);
    reply.body = bytes.substr(headerEnd + 4);
    const auto field =
        std::search(header.begin(), header.end(), lengthField.begin(), lengthField.end(),
                    [](char left, char right) {
                        return (left >= 'A' && left <= 'Z' ? left + 32 : left) == right;
                    });
    if (field == header.end())
        return reply;
    std::string_view value(field + lengthField.size(), header.end());
    value.remove_prefix(std::min(value.find_first_not_of(' '), value.size()));
    std::size_t length = 0;
    std::from_chars(value.data(), value.data() + value.size(), length);
    if (length != reply.body.size())
        reply.status = 0;
    return reply;
}

std::string queryEncoded(std::string_view text) {
    constexpr std::string_view hex = "0123456789ABCDEF";
    std::string encoded;
    for (const char c : text) {
        const bool isPlain = (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') ||
                             (c >= '0' && c <= '9') || c == '-' || c == '_' || c == '.';
        const auto byte = static_cast<unsigned char>(c);
        if (isPlain)
            encoded.push_back(c);
        else
            encoded.append({'%', hex[byte >> 4], hex[byte & 15]});
    }
    return encoded;
}

/// Asks with HTTP 1.0, whose replies end where the connection does.
Reply get(const SyncthingFolder& folder, const std::string& resource, Deadline deadline) {
    ClientSocket socket;
    Reply reply{socket.connectToAddress(folder.address, folder.addressLength, deadline), 0, {}};
    if (reply.outcome == SocketOutcome::Done)
        reply.outcome = socket.send(
            "GET " + resource + " HTTP/1.0\r\nHost: localhost\r\nX-API-Key: " + folder.apiKey +
                "\r\n\r\n",
            deadline);
    std::string bytes;
    if (reply.outcome == SocketOutcome::Done)
        reply.outcome = socket.readToEnd(bytes, kLongestReply, deadline);
    if (reply.outcome != SocketOutcome::Done)
        return reply;
    if (bytes.empty())
        return {SocketOutcome::Gone, 0, {}};
    return parsedReply(bytes);
}

ClientAnswer answerOfFailure(const Reply& reply) {
    if (reply.outcome == SocketOutcome::Gone)
        return {ClientWord::NotKept, "the client does not run"};
    if (reply.outcome == SocketOutcome::TimedOut)
        return {ClientWord::Unclear, "the client does not answer", /*isSilent=*/true};
    return kNotUnderstood;
}

/// One side of what the index holds of an item: this device's, or the newest of all.
struct Version {
    std::vector<Value> counters;  ///< empty where that side has no such item
    bool isDeleted;
    bool isLeftOut;  ///< by the user's patterns, or for now
};

std::optional<Version> versionOf(const Dictionary& answer, std::string_view side) {
    const Value* found = answer.find(side);
    const auto* entry = found ? found->as<Dictionary>() : nullptr;
    const auto flag = [entry](std::string_view key) -> std::optional<bool> {
        const Value* value = entry->find(key);
        const auto* number = value ? value->as<Number>() : nullptr;
        return number ? std::optional(number->boolValue()) : std::nullopt;
    };
    const Value* version = entry ? entry->find("version") : nullptr;
    const auto* counters = version ? version->as<Array>() : nullptr;
    const bool isNone = version && version->as<Null>();
    if (!counters && !isNone)
        return std::nullopt;
    const auto deleted = flag("deleted");
    const auto ignored = flag("ignored");
    const auto invalid = flag("invalid");
    if (!deleted || !ignored || !invalid)
        return std::nullopt;
    Version result{{}, *deleted, *ignored || *invalid};
    if (counters)
        result.counters.assign(counters->begin(), counters->end());
    return result;
}

/// What stands under the name without a version of this device is none that the client brought.
ClientAnswer answerOfVersions(const Version& local, const Version& global, bool stands) {
    const bool isOffered = !global.counters.empty() && !global.isDeleted;
    const bool isHeld = stands && !local.counters.empty() && !local.isDeleted;
    if (!isHeld && isOffered)
        return {ClientWord::NotDownloaded, "the client lists the item and has not brought it yet"};
    if (!isHeld)
        return {ClientWord::Unknown, "the client does not know the item yet"};
    if (local.isLeftOut)
        return {ClientWord::LeftOut, "the client leaves the item out"};
    if (isOffered && local.counters == global.counters)
        return {ClientWord::Current, "this device has the newest version that the client knows"};
    return {ClientWord::Downloaded,
            "this device's version is not the newest that the client knows"};
}

ClientAnswer answerOfIndex(const SyncthingFolder& folder, const SyncedItem& item,
                           Deadline deadline) {
    const Reply reply = get(
        folder,
        "/rest/db/file?folder=" + queryEncoded(folder.id) + "&file=" + queryEncoded(item.relative),
        deadline);
    if (reply.status == 404)
        return {ClientWord::Unknown, "the client does not know the item yet"};
    if (reply.status != 200)
        return answerOfFailure(reply);
    const std::optional<Value> answer = valueOfJson(reply.body);
    const auto* dictionary = answer ? answer->as<Dictionary>() : nullptr;
    const auto local = dictionary ? versionOf(*dictionary, "local") : std::nullopt;
    const auto global = dictionary ? versionOf(*dictionary, "global") : std::nullopt;
    return local && global ? answerOfVersions(*local, *global, item.stands) : kNotUnderstood;
}

/// What one page of the needed items says of a package.
struct NeededPage {
    bool isUnderstood = true;
    bool listsPackage = false;
    std::size_t items = 0;
};

void readNeeded(const Value* list, const std::string& below, NeededPage& page) {
    const auto* items = list ? list->as<Array>() : nullptr;
    page.isUnderstood = page.isUnderstood && (items || (list && list->as<Null>()));
    for (std::size_t i = 0; items && i < items->size(); ++i) {
        const auto* entry = (*items)[i].as<Dictionary>();
        const Value* name = entry ? entry->find("name") : nullptr;
        const auto* text = name ? name->as<String>() : nullptr;
        const Value* deleted = entry ? entry->find("deleted") : nullptr;
        const auto* isDeleted = deleted ? deleted->as<Number>() : nullptr;
        page.isUnderstood = page.isUnderstood && text;
        ++page.items;
        if (text && text->starts_with(below) && !(isDeleted && isDeleted->boolValue()))
            page.listsPackage = true;
    }
}

/// What the index says of the package itself counts once nothing below it is needed.
ClientAnswer answerOfPackage(const SyncthingFolder& folder, const SyncedItem& item,
                             const ClientAnswer& own, Deadline deadline) {
    for (int number = 1; number <= kMostPages; ++number) {
        const Reply reply = get(folder,
                                "/rest/db/need?folder=" + queryEncoded(folder.id) + "&perpage=" +
                                    std::to_string(kPageSize) + "&page=" + std::to_string(number),
                                deadline);
        if (reply.status != 200)
            return answerOfFailure(reply);
        const std::optional<Value> answer = valueOfJson(reply.body);
        const auto* lists = answer ? answer->as<Dictionary>() : nullptr;
        NeededPage page{lists != nullptr};
        for (const std::string_view list : {"progress", "queued", "rest"})
            if (lists)
                readNeeded(lists->find(list), item.relative + "/", page);
        if (!page.isUnderstood)
            return kNotUnderstood;
        if (page.listsPackage)
            return {ClientWord::NotDownloaded, "parts of the package are still needed"};
        if (page.items < kPageSize)
            return own;
    }
    return {ClientWord::Unclear, "the client needs too many items to look through"};
}

}  // namespace

ClientAnswer SyncthingClient::ask(const SyncedItem& item, Deadline deadline) {
    const std::optional<SyncthingFolder> folder = syncthingFolderAt(item.root);
    if (!folder)
        return {ClientWord::NotKept, "the client's configuration has no such folder"};
    if (folder->addressLength == 0)
        return {ClientWord::NotKept, "the client has no plain interface on the loopback"};
    const ClientAnswer answer = answerOfIndex(*folder, item, deadline);
    const bool isAnswer = isSettled(answer.word) && answer.word != ClientWord::NotKept;
    return isAnswer && item.isFolder ? answerOfPackage(*folder, item, answer, deadline) : answer;
}

bool SyncthingClient::fetch(const SyncedItem& item, const std::function<bool()>& isHere,
                            Deadline deadline) {
    for (SyncedItem awaited = item;;) {
        awaited.look();
        const bool hasCome = isHere();
        if (hasCome && !awaited.isFolder)
            return true;
        const ClientWord word = ask(awaited, deadline).word;
        if (hasCome && word != ClientWord::NotKept && isSettled(word))
            return true;
        const auto now = std::chrono::steady_clock::now();
        if (word == ClientWord::NotKept || now >= deadline)
            return false;
        std::this_thread::sleep_until(std::min(deadline, now + kLook));
    }
}

}  // namespace parvel::host
