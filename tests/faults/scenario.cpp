#include "tests/faults/scenario.h"

#include "tests/faults/service_at_hand.h"

#include <algorithm>
#include <fstream>
#include <iterator>
#include <utility>

namespace Faults {
namespace {

namespace fs = std::filesystem;

std::string contentOf(fs::path const& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), {}};
}

bool isHidden(std::string const& name) { return fs::path(name).filename().string().starts_with('.'); }

/// Whether a text is not cut off: it ends as the other one does.
bool endsLike(std::string const& text, std::string const& whole) {
    constexpr std::size_t ENDING = 2;
    return text.size() >= ENDING && whole.ends_with(text.substr(text.size() - ENDING));
}

/// Of a report: what is not drawn but written. In a picture's place may stand why there is none.
std::string withoutPictures(std::string html) {
    constexpr std::string_view SHEET = "<div class=\"sheet\"";
    for (std::size_t at = html.find(SHEET); at != std::string::npos; at = html.find(SHEET, at + 1)) {
        std::size_t const begin = std::min(html.find('\n', at), html.size() - 1) + 1;
        html.erase(begin, html.find('\n', begin) - begin);
    }
    return html;
}

/// What draws pages takes another font, or leaves letters out, where it cannot have what it wants. Of files
/// that it cannot read it tells. Of memory that it does not get for one letter it tells nobody.
bool mayShowLess(Fault const& fault, Ended const& ended) {
    return fault.call == "memory" || !ended.err.empty();
}

std::string verifiedAs(fs::path const& mailing) {
    Ended const ended =
        runWith({}, VLMAIL_PROGRAM, {"pack", "verify", mailing.filename()}, {mailing.parent_path()});
    return withoutIds(ended.out + ended.err);
}

} // namespace

Scenario::Scenario(Command const& command) : command_(command) {
    clean_ = runOnce({});
    after_ = files();
    for (auto const& [name, real] : names())
        if (name.ends_with(".mailing"))
            verdicts_[name] = verifiedAs(folder_ / real);
    if (clean_.status != 0)
        find("fails though nothing is made to fail: " + clean_.err);
    std::ignore = runOnce({});
    for (auto const& [name, content] : files())
        changing_[name] = after_[name] != content;
}

long Scenario::callsOf(std::string const& call) { return runOnce({call, 1, 0, false}).calls; }

std::vector<std::string> Scenario::run(Fault const& fault) {
    Ended const ended = runOnce(fault);
    Files const after = files();
    checkEnd(fault, ended, after);
    checkInputs(after);
    checkOutputs(fault, ended, after);
    return std::exchange(findings_, {});
}

Ended Scenario::runOnce(Fault const& fault) {
    fs::remove_all(folder_);
    fs::create_directory(folder_);
    command_.prepare(folder_);
    before_ = files();
    Ended ended = runWith(fault, VLMAIL_PROGRAM, command_.arguments, {folder_});
    ended.out = withoutIds(ended.out);
    return ended;
}

Scenario::Files Scenario::names() const {
    Files names;
    for (auto const& entry : fs::recursive_directory_iterator(folder_))
        if (entry.is_regular_file()) {
            std::string const name = fs::relative(entry.path(), folder_).string();
            names[withoutIds(name)] = name;
        }
    return names;
}

Scenario::Files Scenario::files() const {
    Files files = names();
    for (auto& [name, content] : files)
        content = contentOf(folder_ / content);
    return files;
}

void Scenario::checkEnd(Fault const& fault, Ended const& ended, Files const& after) {
    for (std::string const& wrong : faultsInEnd(fault, ended))
        find(wrong);
    if (ended.status < 0)
        return;
    // What is wrong with a mailing is the result of "pack verify", and so stands with the others.
    if (ended.status != clean_.status && !saysWhy(ended.err) && ended.out == clean_.out)
        find("fails without a line that says why");
    if (ended.status == clean_.status && ended.out != clean_.out)
        find("says that all went well and prints something else: " + ended.out);
    for (auto const& [name, content] : after_)
        if (ended.status == clean_.status && !after.contains(name))
            find("says that all went well, and " + name + " is missing");
}

void Scenario::checkInputs(Files const& after) {
    for (auto const& [name, content] : before_) {
        bool const isInput = after_.contains(name) && after_.at(name) == content;
        if (isInput && (!after.contains(name) || after.at(name) != content))
            find("has changed its input " + name);
    }
}

void Scenario::checkOutputs(Fault const& fault, Ended const& ended, Files const& after) {
    for (auto const& [name, content] : after) {
        if (before_.contains(name) && before_.at(name) == content)
            continue;
        if (after_.contains(name))
            checkOutput(fault, ended, name, content);
        else if (!isHidden(name) || (ended.status >= 0 && fault.call != "remove"))
            find("leaves " + name);
    }
}

bool Scenario::isSame(std::string const& name, std::string const& content) const {
    std::string const& whole = after_.at(name);
    return changing_.at(name) ? content.size() == whole.size() : content == whole;
}

void Scenario::checkOutput(Fault const& fault, Ended const& ended, std::string const& name,
                           std::string const& content) {
    std::string const& whole = after_.at(name);
    bool const isComplete = ended.status == clean_.status;
    if (name.ends_with(".mailing")) {
        std::string const verdict = verifiedAs(folder_ / names().at(name));
        if (isComplete ? verdict != verdicts_[name] : verdict.find("all whole") == std::string::npos)
            find("leaves a mailing that is not whole: " + verdict);
    } else if (isComplete || name.ends_with(".pdf")) {
        bool const isExcused = name.ends_with(".html") && mayShowLess(fault, ended) &&
                               withoutPictures(content) == withoutPictures(whole);
        if (!isSame(name, content) && !isExcused)
            find("leaves " + name + " with other content than a run in which nothing fails");
    } else if (!endsLike(content, whole)) {
        find("leaves half of " + name);
    }
}

} // namespace Faults
