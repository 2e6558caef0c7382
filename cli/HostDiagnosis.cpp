#include "cli/HostDiagnosis.h"

namespace parvel::cli {

std::vector<Finding> findingsOfReader(const std::optional<ReaderConfinement>& confinement) {
    if (!confinement)
        return {{"noReader",
                 "the helper program can't be started: PDF documents can't be read, nor pictures "
                 "drawn",
                 "install it there, or install the library again"}};
    std::vector<Finding> findings;
    if (!confinement->hasNoFiles)
        findings.push_back({"noLandlock",
                            "the kernel doesn't keep the helper program from files; its other "
                            "limits hold",
                            "a kernel from 5.13 on does, where Landlock is switched on"});
    if (!confinement->hasSystemCallFilter)
        findings.push_back({"noSystemCallFilter",
                            "the kernel doesn't filter the helper program's system calls; its "
                            "other limits hold",
                            "a kernel with seccomp filters does"});
    return findings;
}

}  // namespace parvel::cli
