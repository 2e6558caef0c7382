// libgepub: the title and the author of an EPUB book. It crashes at a book that lacks the table of
// contents which its package document names; with "sift" each book is read in a process of its own,
// and the paths of those that it survives are printed.

#include <gepub.h>
#include <sys/wait.h>
#include <unistd.h>

#include "bench/Runner.h"

namespace {

bool readBook(const std::string& path) {
    GepubDoc* book = gepub_doc_new(path.c_str(), nullptr);
    if (!book)
        return false;
    g_free(gepub_doc_get_metadata(book, GEPUB_META_TITLE));
    g_free(gepub_doc_get_metadata(book, GEPUB_META_AUTHOR));
    g_object_unref(book);
    return true;
}

bool survives(const std::string& path) {
    const pid_t child = fork();
    if (child == 0)
        _exit(readBook(path) ? 0 : 1);
    int status = 0;
    return waitpid(child, &status, 0) == child && WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

}  // namespace

int main(int argumentCount, char** argumentWords) {
    const auto arguments = parvel::bench::argumentsOf(argumentCount, argumentWords);
    if (!arguments.has("sift"))
        return parvel::bench::runOver(arguments, readBook);
    for (const std::string& path : arguments.paths) {
        if (survives(path))
            std::printf("%s\n", path.c_str());
    }
    return 0;
}
