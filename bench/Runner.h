#pragma once

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <string>
#include <string_view>
#include <vector>

namespace parvel::bench {

/// The words of a contender's command line: LIST, then what it takes besides.
struct Arguments {
    std::vector<std::string> paths;  ///< those in the list, one a line
    std::vector<std::string> words;

    [[nodiscard]] bool has(std::string_view word) const {
        for (const std::string& each : words) {
            if (each == word)
                return true;
        }
        return false;
    }
};

inline Arguments argumentsOf(int count, char** arguments) {
    Arguments result;
    result.words.assign(arguments + (count < 2 ? count : 2), arguments + count);
    std::ifstream list(count < 2 ? "" : arguments[1]);
    for (std::string path; std::getline(list, path);)
        result.paths.push_back(path);
    return result;
}

/// Does the work for each path, and prints for how many it went well.
template <class Work>
int runOver(const Arguments& arguments, Work&& work) {
    std::size_t succeeded = 0;
    for (const std::string& path : arguments.paths)
        succeeded += work(path) ? 1 : 0;
    std::printf("%zu of %zu\n", succeeded, arguments.paths.size());
    return 0;
}

/// The same for what writes: LIST INTO. The work gets a new folder below INTO for each path.
template <class Work>
int runInto(const Arguments& arguments, Work&& work) {
    if (arguments.words.empty())
        return 2;
    std::size_t number = 0;
    return runOver(arguments, [&](const std::string& path) {
        const std::string folder = arguments.words[0] + "/" + std::to_string(number++);
        return std::filesystem::create_directory(folder) && work(path, folder);
    });
}

}  // namespace parvel::bench
