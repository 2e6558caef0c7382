// KFileMetaData: what a desktop's file indexer reads. The second argument is the files' MIME type.

#include <KFileMetaData/ExtractorCollection>
#include <KFileMetaData/SimpleExtractionResult>
#include <QCoreApplication>

#include "bench/Runner.h"

int main(int argumentCount, char** argumentWords) {
    const QCoreApplication application(argumentCount, argumentWords);
    const auto arguments = parvel::bench::argumentsOf(argumentCount, argumentWords);
    if (arguments.words.empty())
        return 2;
    const QString type = QString::fromStdString(arguments.words[0]);
    const KFileMetaData::ExtractorCollection collection;
    const QList<KFileMetaData::Extractor*> extractors = collection.fetchExtractors(type);
    return parvel::bench::runOver(arguments, [&](const std::string& path) {
        KFileMetaData::SimpleExtractionResult result(
            QString::fromStdString(path), type, KFileMetaData::ExtractionResult::ExtractMetaData);
        for (KFileMetaData::Extractor* extractor : extractors)
            extractor->extract(&result);
        return !result.properties(KFileMetaData::MultiMap).isEmpty();
    });
}
