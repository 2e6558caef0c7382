#include "parvel/platform/linux/cloud/NextcloudClient.h"

#include <stdlib.h>
#include <sys/stat.h>
#include <unicode/normalizer2.h>
#include <unicode/unistr.h>

#include <algorithm>
#include <optional>

#include "parvel/platform/linux/ItemTree.h"

namespace parvel::host {

namespace {

constexpr std::size_t kLongestLine = 16'384;
/// Of one conversation. The client pushes lines of its own between the answers.
constexpr int kMostLines = 10'000;
/// How often the disk is looked at while the client downloads.
constexpr std::chrono::milliseconds kSocketLook{50};

bool isSameFolder(const std::string& left, const std::string& right) {
    struct stat leftStatus {};
    struct stat rightStatus {};
    return ::stat(left.c_str(), &leftStatus) == 0 && ::stat(right.c_str(), &rightStatus) == 0 &&
           isSameItem(leftStatus, rightStatus);
}

/// The path as the client reads it off a line: in Unicode's composed form, without white space at
/// its end. None for a path that no line can carry unchanged.
std::optional<std::string> sendablePath(const std::string& path) {
    UErrorCode status = U_ZERO_ERROR;
    const icu::Normalizer2* composed = icu::Normalizer2::getNFCInstance(status);
    const auto text = icu::UnicodeString::fromUTF8(path);
    std::string back;
    text.toUTF8String(back);
    const bool isCutOff = path.find_first_of("\n\x1e") != path.npos ||
                          path.find_last_not_of(" \t\v\f\r") != path.size() - 1;
    if (back != path || isCutOff || U_FAILURE(status))
        return std::nullopt;
    std::string normalized;
    composed->normalize(text, status).toUTF8String(normalized);
    return U_SUCCESS(status) ? std::optional(normalized) : std::nullopt;
}

ClientAnswer answerOfStatus(std::string_view status) {
    // A shared item's mark.
    if (status.ends_with("+SWM"))
        status.remove_suffix(4);
    if (status == "OK")
        return {ClientWord::Current, "the client says that the item is in step"};
    if (status == "SYNC")
        return {ClientWord::Busy, "the client is still busy with the item"};
    if (status == "NOP")
        return {ClientWord::Unknown, "the client does not know the item yet"};
    if (status == "IGNORE")
        return {ClientWord::Downloaded, "the client leaves the item out, or warns of it"};
    if (status == "ERROR")
        return {ClientWord::Downloaded, "the client could not bring the item into step"};
    return {ClientWord::Unclear, "the client's answer is not understood"};
}

/// One conversation with the client, which begins with it telling the folders that it keeps.
class Conversation {
public:
    explicit Conversation(Deadline deadline) : m_deadline(deadline) {}

    /// Connects and finds the folder with the item's root; its outcome is Done also where the
    /// client keeps no such folder.
    SocketOutcome begin(const SyncedItem& item) {
        const char* folder = ::secure_getenv("XDG_RUNTIME_DIR");
        if (!folder || *folder != '/')
            return SocketOutcome::Gone;
        SocketOutcome outcome =
            m_socket.connectToPath(std::string(folder) + "/Nextcloud/socket", m_deadline);
        if (outcome == SocketOutcome::Done)
            outcome = m_socket.send("VERSION:\n", m_deadline);
        std::string line;
        while (outcome == SocketOutcome::Done && !line.starts_with("VERSION:")) {
            outcome = readLine(line);
            constexpr std::string_view registered = "REGISTER_PATH:";
            if (outcome == SocketOutcome::Done && !m_folder && line.starts_with(registered) &&
                isSameFolder(line.substr(registered.size()), item.root))
                m_folder = line.substr(registered.size());
        }
        return outcome;
    }

    /// The item's path in the folder as the client names it.
    [[nodiscard]] std::optional<std::string> pathOf(const SyncedItem& item) const {
        return m_folder ? sendablePath(*m_folder + "/" + item.relative) : std::nullopt;
    }

    SocketOutcome retrieveStatus(const std::string& path, std::string& status) {
        constexpr std::string_view answer = "STATUS:";
        SocketOutcome outcome = m_socket.send("RETRIEVE_FILE_STATUS:" + path + "\n", m_deadline);
        std::string line;
        while (outcome == SocketOutcome::Done) {
            outcome = readLine(line);
            const std::size_t end = line.find(':', answer.size());
            if (outcome == SocketOutcome::Done && line.starts_with(answer) &&
                end != std::string::npos && std::string_view(line).substr(end + 1) == path) {
                status = line.substr(answer.size(), end - answer.size());
                break;
            }
        }
        return outcome;
    }

    /// Whether the client says that nothing of the folder is still to come.
    bool isSettledAt(const std::string& path) {
        std::string status;
        return retrieveStatus(path, status) == SocketOutcome::Done &&
               isSettled(answerOfStatus(status).word);
    }

    SocketOutcome makeAvailable(const std::string& path) {
        // A file goes by the name of its placeholder too; the separator stands between items.
        return m_socket.send("MAKE_AVAILABLE_LOCALLY:" + path + "\x1e" + path +
                                 std::string(nextcloudPlaceholderSuffix) + "\n",
                             m_deadline);
    }

    /// Reads what the client tells until then, which is TimedOut.
    SocketOutcome listen(Deadline until) {
        SocketOutcome outcome = SocketOutcome::Done;
        for (std::string line; outcome == SocketOutcome::Done;)
            outcome = m_socket.readLine(line, kLongestLine, until);
        return outcome;
    }

private:
    SocketOutcome readLine(std::string& line) {
        return --m_linesLeft < 0 ? SocketOutcome::TooLong
                                 : m_socket.readLine(line, kLongestLine, m_deadline);
    }

    ClientSocket m_socket;
    Deadline m_deadline;
    int m_linesLeft = kMostLines;
    std::optional<std::string> m_folder;
};

ClientAnswer answerOfFailure(SocketOutcome outcome) {
    switch (outcome) {
        case SocketOutcome::TimedOut:
            return {ClientWord::Unclear, "the client does not answer", /*isSilent=*/true};
        case SocketOutcome::TooLong:
            return {ClientWord::Unclear, "the client's answer is not understood"};
        case SocketOutcome::Done:
        case SocketOutcome::Gone:
            break;
    }
    return {ClientWord::NotKept, "the client does not run"};
}

}  // namespace

ClientAnswer NextcloudClient::ask(const SyncedItem& item, Deadline deadline) {
    Conversation conversation(deadline);
    SocketOutcome outcome = conversation.begin(item);
    if (outcome != SocketOutcome::Done)
        return answerOfFailure(outcome);
    const std::optional<std::string> path = conversation.pathOf(item);
    if (!path)
        return {ClientWord::NotKept, "the client keeps no such folder or name"};
    std::string status;
    outcome = conversation.retrieveStatus(*path, status);
    return outcome == SocketOutcome::Done ? answerOfStatus(status) : answerOfFailure(outcome);
}

bool NextcloudClient::fetch(const SyncedItem& item, const std::function<bool()>& isHere,
                            Deadline deadline) {
    Conversation conversation(deadline);
    if (conversation.begin(item) != SocketOutcome::Done)
        return false;
    const std::optional<std::string> path = conversation.pathOf(item);
    if (!path || (!isHere() && conversation.makeAvailable(*path) != SocketOutcome::Done))
        return false;
    for (SyncedItem awaited = item;;) {
        const bool hasCome = isHere();
        awaited.look();
        if (hasCome && (!awaited.isFolder || conversation.isSettledAt(*path)))
            return true;
        const auto now = std::chrono::steady_clock::now();
        if (now >= deadline)
            return false;
        if (conversation.listen(std::min(deadline, now + kSocketLook)) != SocketOutcome::TimedOut)
            return isHere() && !awaited.isFolder;
    }
}

}  // namespace parvel::host
