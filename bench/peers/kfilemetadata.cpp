// KFileMetaData: what a desktop's file indexer reads. The second argument is the files' MIME type.

#include <KFileMetaData/ExtractorCollection>
#include <KFileMetaData/SimpleExtractionResult>
#include <QCoreApplication>

#include "bench/Runner.h"

int main(int argumentCount, char** arguments) {
    const QCoreApplication application(argumentCount, arguments);
    const QString type = QString::fromLocal8Bit(argumentCount > 2 ? arguments[2] : "");
    const KFileMetaData::ExtractorCollection collection;
    const QList<KFileMetaData::Extractor*> extractors = collection.fetchExtractors(type);
    return parvel::bench::runOver(argumentCount, arguments, [&](const std::string& path) {
        KFileMetaData::SimpleExtractionResult result(
            QString::fromStdString(path), type, KFileMetaData::ExtractionResult::ExtractMetaData);
        for (KFileMetaData::Extractor* extractor : extractors)
            extractor->extract(&result);
        return !result.properties(KFileMetaData::MultiMap).isEmpty();
    });
}
