// The least that a zipped book costs: one open, the extended attributes, the directory from the
// file's tail, the documents inflated and checked, the package document's MD5. It builds nothing
// and checks little else.

#include "bench/Runner.h"
#include "bench/floor/Attributes.h"
#include "bench/floor/Documents.h"
#include "bench/floor/Zip.h"

int main(int argumentCount, char** argumentWords) {
    using namespace parvel::bench;
    return runOver(argumentsOf(argumentCount, argumentWords), [](const std::string& path) {
        Zip zip(path);
        readAttributes(zip.file());
        return zip.readDirectory() &&
               readDocuments([&zip](const std::string& name, std::string& document) {
                   Zip::Entry entry;
                   return zip.find(name, entry) && zip.read(entry, document);
               });
    });
}
