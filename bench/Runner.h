#pragma once

#include <cstdio>
#include <cstring>
#include <fstream>
#include <string>
#include <vector>

namespace parvel::bench {

/// A contender: reads each file named in the list (one path a line) given as its first argument,
/// and prints how many it could read.
template <class Read>
int runOver(int argumentCount, char** arguments, Read&& read) {
    if (argumentCount < 2) {
        std::fprintf(stderr, "usage: %s LIST\n", arguments[0]);
        return 2;
    }
    std::ifstream list(arguments[1]);
    std::vector<std::string> paths;
    for (std::string path; std::getline(list, path);)
        paths.push_back(path);
    std::size_t succeeded = 0;
    for (const std::string& path : paths)
        succeeded += read(path) ? 1 : 0;
    std::printf("%zu of %zu\n", succeeded, paths.size());
    return 0;
}

}  // namespace parvel::bench
