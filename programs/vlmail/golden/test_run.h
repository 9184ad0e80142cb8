#pragma once
// Runs test cases of presets.

#include "programs/vlmail/golden/test_case.h"
#include "programs/vlmail/letters/batch.h"
#include "programs/vlmail/letters/preset_index.h"
#include "programs/vlmail/letters/reading.h"

#include <cstddef>
#include <map>
#include <string>
#include <vector>

namespace VlMail {

class NodeSettings;

enum class Verdict { Ok, Differs, New, Written, Failed };

struct TestResult {
    Verdict verdict = Verdict::Ok;
    /// A sentence each, of a case that differs or did so before it was written.
    std::vector<std::string> differences;
    /// One line, of a case that failed or is new.
    std::string message;
};

enum class UpdateExpectations { No, Yes };

class TestRun {
public:
    /// The settings must live as long as the run.
    TestRun(NodeSettings const& settings, UpdateExpectations update);

    /// Reads the documents of the cases, all at once, on up to `workers` processes.
    void readDocuments(std::vector<TestCase> const& cases, Workers const& workers, BatchWatcher& watcher);
    /// One of the cases whose documents were read.
    TestResult run(TestCase const& one) const;

private:
    DocumentReading readingOf(TestCase const& one) const;
    TestResult compare(TestCase const& one, DocumentReading const& reading) const;

    NodeSettings const& settings_;
    Cfg::Presets presets_;
    PresetIndex index_;
    bool update_;
    std::map<std::string, DocumentReading> readings_;
};

} // namespace VlMail
