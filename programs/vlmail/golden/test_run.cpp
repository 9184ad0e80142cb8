#include "programs/vlmail/golden/test_run.h"

#include "programs/base/error.h"
#include "programs/base/pending_file.h"
#include "programs/base/plain_text.h"
#include "programs/base/read_file.h"
#include "programs/base/utf8.h"
#include "programs/reader/document.h"
#include "programs/vlmail/golden/expectation.h"
#include "programs/vlmail/golden/zones_text.h"
#include "programs/vlmail/letters/batch.h"
#include "programs/vlmail/letters/node_settings.h"

#include <exception>
#include <utility>

namespace VlMail {
namespace {

TestResult failed(std::string const& why) { return {Verdict::Failed, {}, Base::plainLine(why)}; }

json::Object expectationIn(std::filesystem::path const& file) {
    try {
        return readExpectation(Base::readFile(file));
    } catch (Base::Error const& wrong) {
        throw Base::Error(Base::Code::ExpectationMalformed,
                          "its expectation cannot be used: " + std::string(wrong.what()));
    }
}

TestResult write(TestCase const& one, DocumentReading const& reading, std::vector<std::string> differences) {
    Base::writeFile(one.expectation, printed(expectationOf(reading)));
    return {Verdict::Written, std::move(differences), {}};
}

} // namespace

TestRun::TestRun(NodeSettings const& settings, UpdateExpectations update)
    : settings_(settings), presets_(settings.presets()), index_(presets_),
      update_(update == UpdateExpectations::Yes) {}

void TestRun::readDocuments(std::vector<TestCase> const& cases, Workers const& workers,
                            BatchWatcher& watcher) {
    std::vector<std::string> files;
    for (TestCase const& one : cases)
        if (one.hasDocument() && !one.isZonesText())
            files.push_back(one.document.string());
    readBatch(files, settings_, workers, {}, watcher, [&](std::size_t index, ReadResult result) {
        readings_[files[index]] = std::move(result.reading);
    });
}

TestResult TestRun::run(TestCase const& one) const {
    if (!one.hasDocument())
        return failed("its document is missing; bring it back, or remove the expectation");
    try {
        DocumentReading const reading = readingOf(one);
        return reading.failed() ? failed(reading.error) : compare(one, reading);
    } catch (std::exception const& failure) {
        return failed(failure.what());
    }
}

DocumentReading TestRun::readingOf(TestCase const& one) const {
    if (!one.isZonesText())
        return readings_.at(one.document.string());
    return readZonesFile(one.document, index_);
}

TestResult TestRun::compare(TestCase const& one, DocumentReading const& reading) const {
    if (!std::filesystem::exists(one.expectation)) {
        if (update_)
            return write(one, reading, {});
        return {Verdict::New, {}, "nothing is expected of it yet; --update writes what is found"};
    }
    auto const& definitions = index_.findMatch(reading.document).first.zones();
    std::vector<std::string> found = differences(expectationIn(one.expectation), reading, definitions);
    if (found.empty())
        return {};
    return update_ ? write(one, reading, std::move(found))
                   : TestResult{Verdict::Differs, std::move(found), {}};
}

} // namespace VlMail
