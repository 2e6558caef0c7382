// libgepub: the title and the author of an EPUB book.

#include <gepub.h>

#include "bench/Runner.h"

int main(int argumentCount, char** arguments) {
    return parvel::bench::runOver(argumentCount, arguments, [](const std::string& path) {
        GepubDoc* book = gepub_doc_new(path.c_str(), nullptr);
        if (!book)
            return false;
        g_free(gepub_doc_get_metadata(book, GEPUB_META_TITLE));
        g_free(gepub_doc_get_metadata(book, GEPUB_META_AUTHOR));
        g_object_unref(book);
        return true;
    });
}
