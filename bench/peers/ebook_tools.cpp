// ebook-tools: the title and the creators of an EPUB book.

#include <cstdlib>

extern "C" {
#include <epub.h>
}

#include "bench/Runner.h"

namespace {

void drop(struct epub* book, enum epub_metadata kind) {
    int count = 0;
    unsigned char** texts = epub_get_metadata(book, kind, &count);
    for (int i = 0; i < count; ++i)
        std::free(texts[i]);
    std::free(texts);
}

bool readBook(const std::string& path) {
    struct epub* book = epub_open(path.c_str(), 0);
    if (!book)
        return false;
    drop(book, EPUB_TITLE);
    drop(book, EPUB_CREATOR);
    epub_close(book);
    return true;
}

}  // namespace

int main(int argumentCount, char** argumentWords) {
    const auto arguments = parvel::bench::argumentsOf(argumentCount, argumentWords);
    return parvel::bench::runOver(arguments, readBook);
}
