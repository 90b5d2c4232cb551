/// The agent's end of the library's reports: the lines it logs, and the states and losses it reports.
#ifndef TESTS_UNIT_LINUX_LINUXLOG_H
#define TESTS_UNIT_LINUX_LINUXLOG_H

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

/// While one lives, what its thread does is the test's own doing and not the library's: the kernel's, or the agent's.
class ZTCTestsOwn {
public:
    ZTCTestsOwn() { ++sDepth; }
    ~ZTCTestsOwn() { --sDepth; }
    ZTCTestsOwn(const ZTCTestsOwn&) = delete;
    ZTCTestsOwn& operator=(const ZTCTestsOwn&) = delete;

    static bool isHere() { return sDepth != 0; }

private:
    static inline thread_local unsigned sDepth = 0;
};

/// The lines that the library logs, and the reports that it makes, while it is there.
class ZTCLinuxLog {
public:
    ZTCLinuxLog();
    ~ZTCLinuxLog();
    ZTCLinuxLog(const ZTCLinuxLog&) = delete;
    ZTCLinuxLog& operator=(const ZTCLinuxLog&) = delete;

    /// "LEVEL TEXT"
    std::vector<std::string> lines() const;
    /// How many contain this text.
    std::size_t count(const std::string& acrText) const;
    std::string all() const;

    /// The last report of a kind's source on a board: "working", "no source", "no rights" or "failed", and " (REASON)"
    /// where there is one; empty where there was no report.
    std::string source(std::uint32_t aBoard, std::uint32_t aCategory, std::uint32_t aSubcategory) const;
    /// All reports of it, in order.
    std::vector<std::string> sources(std::uint32_t aBoard, std::uint32_t aCategory, std::uint32_t aSubcategory) const;
    /// The last total of a loss; nothing where it was not reported.
    std::optional<std::uint64_t> loss(const std::string& acrName) const;
};

#endif
