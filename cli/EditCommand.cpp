#include "cli/AssetChanges.h"
#include "cli/BookStaging.h"
#include "cli/CallLog.h"
#include "cli/Command.h"
#include "cli/FileContents.h"
#include "cli/Progress.h"
#include "cli/PropertyValue.h"
#include "cli/RecordFile.h"
#include "parvel/metadata/PVAssetMetadataKeys.h"

namespace parvel::cli {
namespace {

constexpr std::size_t kLargestCover = std::size_t{64} << 20;

class EditCommand : public Command {
public:
    void declare(CommandLine& line) override;
    int run(std::vector<std::string> operands) override;

private:
    void readUpdates();
    [[nodiscard]] Dictionary updatesFor(const AssetPtr& asset) const;
    [[nodiscard]] bool isRefused(const AssetPtr& asset, const Dictionary& updates,
                                 Result& result) const;
    void edit(PVAssetMetadataFileManager& manager, const AssetPtr& asset, Result& result) const;
    [[nodiscard]] std::string outcomeOf(PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                                        const AssetPtr& edited, Result& result) const;

    std::vector<std::string> m_sets;
    std::optional<std::string> m_updatesFile;
    std::optional<std::string> m_coverFile;
    bool m_restoresCover = false;
    bool m_inflates = false;
    BookStaging m_staging;
    ProgressOption m_progress;
    AssetChanges m_changes{Uninspectable::Fails};

    std::vector<PropertyValue> m_values;
    Dictionary m_updates;
    Progress::Form m_form = Progress::Form::Auto;
};

void EditCommand::declare(CommandLine& line) {
    line.group("What is changed");
    line.list("--set", "KEY=VALUE",
              "change KEY of the record, or the property of that name,\n"
              "to VALUE",
              m_sets);
    line.option("--updates", "FILE",
                "change what FILE, a property list or JSON dictionary,\n"
                "says",
                m_updatesFile);
    line.option("--cover", "IMAGE", "make that file the cover", m_coverFile);
    line.flag("--restore-cover", "take the first cover back", m_restoresCover);
    line.exclusive({"--cover", "--restore-cover"});
    line.flag("--inflate",
              "write cover and metadata into the book too; a zipped one\n"
              "is expanded in its place first",
              m_inflates);
    m_staging.declare(line);
    m_progress.declare(line);
    m_changes.declareForce(line, "do it even where that loses something");
    m_changes.declare(line);
}

int EditCommand::run(std::vector<std::string> operands) {
    m_changes.begin();
    m_staging.begin();
    m_form = m_progress.form();
    readUpdates();
    return m_changes.run("edit", std::move(operands),
                         [this](PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                                Result& result) { edit(manager, asset, result); });
}

void EditCommand::readUpdates() {
    for (const std::string& set : m_sets)
        m_values.push_back(PropertyValue::fromText("--set", set));
    std::string problem;
    if (m_updatesFile) {
        const auto updates = dictionaryFromFile(*m_updatesFile, problem);
        if (!updates)
            throw UsageError("--updates " + *m_updatesFile + ": " + problem);
        m_updates = *updates;
    }
    if (m_coverFile) {
        const auto cover = contentsOfFile(*m_coverFile, kLargestCover, problem);
        if (cover && cover->empty())
            problem = "the file is empty";
        if (!cover || cover->empty())
            throw UsageError("--cover " + *m_coverFile + ": " + problem);
        m_updates.set(key::coverImageData, Data::copyOf(*cover));
    }
    if (m_restoresCover)
        m_updates.set(key::coverImageData, Value());
    if (m_sets.empty() && !m_updatesFile && !m_coverFile && !m_restoresCover)
        throw UsageError("say what to change: --set, --updates, --cover or --restore-cover");
}

Dictionary EditCommand::updatesFor(const AssetPtr& asset) const {
    Dictionary updates = m_updates;
    for (const PropertyValue& value : m_values)
        value.storeIn(updates, *asset->dictionaryRepresentation());
    return updates;
}

bool EditCommand::isRefused(const AssetPtr& asset, const Dictionary& updates,
                            Result& result) const {
    if (m_changes.isForced())
        return false;
    // A book is expanded from the place that its record names, over what has that name beside it,
    // and what is written goes there.
    const auto record = asset->dictionaryRepresentation();
    const auto isElsewhere = [&](std::string_view place) {
        const Value* told = updates.find(place);
        const Value* known = record->find(place);
        return told && !(known && *told == *known);
    };
    if (isElsewhere(key::sourcePath) || isElsewhere(key::path)) {
        refuse(result, "the record would name another place, and the asset would stay in its own",
               "\"parvel move\" moves it; --force edits what the record names then");
        return true;
    }
    const auto backup = asset->bazaarArtworkBackupURL();
    if (m_restoresCover && m_inflates && backup && !standsAt(*backup)) {
        refuse(result, "no first cover is kept in the book, and the present one would be lost",
               "give --force to lose it");
        return true;
    }
    return isRefusedForCapitals(asset, result);
}

void EditCommand::edit(PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                       Result& result) const {
    const Dictionary updates = updatesFor(asset);
    if (isRefused(asset, updates, result))
        return;
    std::optional<StagingPlace> place = StagingPlace{};
    const bool isExpanded = m_inflates && asset->isCompressedBookWithError() == true;
    if (isExpanded)
        place = m_staging.placeFor(*asset->url(), asset->url()->deletingLastPathComponent(),
                                   m_changes.isForced(), result);
    if (!place)
        return;
    AssetPtr edited;
    CallLog log;
    {
        BusyProgress progress(m_form, result.path);
        edited = manager.updateAsset_withUpdates_temporaryDirectory_inflateIfNeeded_error(
            asset, &updates, place->directory, m_inflates, &result.error);
        if (edited)
            progress.finish();
    }
    setRecord(result, edited, PVAssetMetadataFlavorFull);
    result.nothing = edited ? "not all of it is written" : "not edited";
    result.reason = log.reason();
    result.isUndone = edited && log.hasKnownReason();
    if (edited && !result.isUndone)
        result.outcome = outcomeOf(manager, asset, edited, result);
    const bool isBadName = !edited && result.error == makeMissingURLError();
    if (isBadName)
        result.advice = "its display name makes no name of a file";
}

std::string EditCommand::outcomeOf(PVAssetMetadataFileManager& manager, const AssetPtr& asset,
                                   const AssetPtr& edited, Result& result) const {
    // Where nothing but the name changes, the library gives the record of the old name.
    if (edited == asset)
        return manager.fileManager()->itemExistsAtPath(asset->url()->path())
                   ? "says so already"
                   : "renamed after its display name";
    if (edited->url() != asset->url())
        return "edited, renamed to " + edited->url()->path();
    if (asset->isAudiobook())
        return "nothing is written on an audiobook; this is what its record would be";
    if (asset->isBook() && m_inflates)
        return "edited";
    // What an edit could not write it tells nobody; written once more, that has an error.
    std::optional<Error> error;
    (void)manager.updateExtendedAttributesForAsset_error(edited, &error);
    if (error == makeNoIdentityError())
        return "nothing is written: the file keeps no attributes of this asset; write them first, "
               "with \"parvel attributes --write\"";
    result.error = error;
    return asset->isBook() ? "its attributes are written; --inflate writes into the book, too"
                           : "its attributes are written";
}

}  // namespace

std::unique_ptr<Command> makeEditCommand() {
    return std::make_unique<EditCommand>();
}

}  // namespace parvel::cli
