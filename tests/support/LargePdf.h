#pragma once

#include <cstdint>
#include <filesystem>
#include <fstream>
#include <string>
#include <system_error>

#include "tests/support/PdfBuilder.h"

namespace parvel::testing {

/// Writes a document by Thoreau with one page, whose table of objects stands behind an object with
/// a hole that large. The error where the file system has no files of that size.
inline std::error_code writeLargePdf(const std::string& path, std::uint64_t hole) {
    const std::string text = PdfBuilder{}.information("/Author (Thoreau)").page("").bytes();
    const std::size_t table = text.find("xref\n");
    const std::string begin =
        text.substr(0, table) + "9 0 obj << /Length " + std::to_string(hole) + " >>\nstream\n";
    const std::string end = "\nendstream\nendobj\n";
    std::ofstream(path, std::ios::binary) << begin;
    std::error_code problem;
    std::filesystem::resize_file(path, begin.size() + hole, problem);
    if (!problem)
        std::ofstream(path, std::ios::binary | std::ios::app)
            << end << text.substr(table, text.find("startxref\n") - table) << "startxref\n"
            << begin.size() + hole + end.size() << "\n%%EOF\n";
    return problem;
}

}  // namespace parvel::testing
