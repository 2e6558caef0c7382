// TagLib: the tags of an MP4 audio file.

#include <taglib/mp4file.h>

#include "bench/Runner.h"

int main(int argumentCount, char** argumentWords) {
    const auto arguments = parvel::bench::argumentsOf(argumentCount, argumentWords);
    return parvel::bench::runOver(arguments, [](const std::string& path) {
        TagLib::MP4::File file(path.c_str(), false);
        return file.isValid() && file.tag() && !file.tag()->itemMap().isEmpty();
    });
}
