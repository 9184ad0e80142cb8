#include "programs/vlmail/golden/test_case.h"

#include "programs/base/error.h"
#include "programs/base/utf8.h"
#include "programs/vlmail/presets/words.h"

#include <algorithm>
#include <cctype>
#include <set>
#include <system_error>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

constexpr std::string_view EXPECTED_ENDING = ".expected.json";
constexpr std::string_view ZONES_ENDING = ".zones";

/// The document that an expectation belongs to; empty for any other file.
fs::path documentBeside(fs::path const& expectation) {
    std::string text = expectation.string();
    if (!text.ends_with(EXPECTED_ENDING))
        return {};
    text.resize(text.size() - EXPECTED_ENDING.size());
    return text;
}

std::vector<fs::path> filesIn(fs::path const& folder) {
    std::error_code failure;
    fs::recursive_directory_iterator entries(folder, failure);
    if (failure)
        throw Base::Error(Base::Code::FileUnreadable,
                          "cannot look into the folder " + inQuotes(folder.string()) + ": " +
                              failure.message() + "; name a folder with test cases");
    std::vector<fs::path> files;
    for (fs::directory_entry const& entry : entries)
        if (entry.is_regular_file())
            files.push_back(entry.path());
    std::ranges::sort(files);
    return files;
}

} // namespace

bool isTestDocument(fs::path const& file) {
    std::string ending = file.extension().string();
    std::ranges::transform(ending, ending.begin(),
                           [](unsigned char c) { return static_cast<char>(std::tolower(c)); });
    return ending == ".pdf" || ending == ".txt" || isZonesText(file);
}

bool isZonesText(fs::path const& file) { return file.extension() == ZONES_ENDING; }

fs::path expectationBeside(fs::path const& document) { return document.string().append(EXPECTED_ENDING); }

bool TestCase::isZonesText() const { return VlMail::isZonesText(document); }

std::vector<TestCase> testCasesIn(fs::path const& folder) {
    std::vector<TestCase> cases;
    std::vector<fs::path> const files = filesIn(folder);
    std::set<fs::path> const known(files.begin(), files.end());
    auto const nameOf = [&](fs::path const& file) {
        return Base::validUtf8(fs::relative(file, folder).string());
    };
    for (fs::path const& file : files) {
        fs::path const document = documentBeside(file);
        if (isTestDocument(file))
            cases.push_back({file, expectationBeside(file), nameOf(file)});
        else if (!document.empty() && !known.contains(document))
            cases.push_back({{}, file, nameOf(file)});
    }
    if (cases.empty())
        throw Base::Error(Base::Code::FileUnsuitable, "there are no test cases in " +
                                                          inQuotes(folder.string()) +
                                                          "; put PDF or text documents there");
    return cases;
}

} // namespace VlMail
