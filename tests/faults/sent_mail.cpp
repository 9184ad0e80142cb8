#include "tests/faults/sent_mail.h"

#include "programs/base/read_file.h"

#include <chrono>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <regex>
#include <utility>

namespace Faults {
namespace {

std::vector<std::string> idsIn(std::string const& json) {
    static std::regex const id("\"id\":\"([^\"]*)\"");
    std::vector<std::string> ids;
    for (std::sregex_iterator found(json.begin(), json.end(), id), end; found != end; ++found)
        ids.push_back((*found)[1]);
    return ids;
}

bool isSaid(std::string const& text, std::string const& part) { return text.find(part) != std::string::npos; }

} // namespace

std::vector<std::string> SentMail::run(Fault const& fault) {
    before_ = mailings();
    // All would seem to be new.
    if (!findings_.empty())
        return std::exchange(findings_, {});
    Ended const ended = send(fault);
    for (std::string const& wrong : faultsInEnd(fault, ended))
        find(wrong);
    if (ended.status > 0 && !saysWhy(ended.err + ended.out))
        find("fails without a line that says why: " + ended.out + ended.err);
    check(ended);
    return std::exchange(findings_, {});
}

/// One that nobody had before.
void SentMail::writeNewLetter() {
    std::filesystem::path const file = service_.folder() / "letter.txt";
    if (letter_.empty())
        letter_ = Base::readFile(file);
    std::ofstream(file) << letter_ << "Letter " << ++letters_ << '\n';
}

Ended SentMail::send(Fault const& fault) {
    writeNewLetter();
    return service_.vlmail({"mail", "letter.txt", "--send", "--node", "a=acme", "--jobs", "1"}, fault);
}

void SentMail::check(Ended const& ended) {
    if (ended.status == 0 && mailings().size() != before_.size() + 1)
        find("says that a mailing was sent, and it is not there: " + ended.out);
    resumeStranded();
    std::multiset<std::string> const after = mailings();
    if (after.size() > before_.size() + 1 ||
        std::set<std::string>(after.begin(), after.end()).size() != after.size())
        find("sends a mailing twice, of " + std::to_string(before_.size()) + " before:" + newOnes(after));
    for (std::string const& id : after)
        if (!before_.contains(id) &&
            !isSaid(service_.verify(service_.data() / "outbox" / (id + ".mailing")), "all whole"))
            find("sends the mailing " + id + ", which is not whole");
}

std::string SentMail::newOnes(std::multiset<std::string> const& after) const {
    std::string all;
    for (std::string const& id : after)
        if (!before_.contains(id) || after.count(id) > 1)
            all += ' ' + id;
    return all;
}

void SentMail::resumeStranded() {
    Ended const stranded = service_.vlmail({"status", "--stranded", "--node", "a=acme", "--json"});
    for (std::string const& id : idsIn(stranded.out))
        if (Ended const ended = service_.vlmail({"resume", id, "--node", "a=acme"}); ended.status != 0)
            find("leaves the mailing " + id + ", which cannot be resumed: " + ended.err);
}

std::multiset<std::string> SentMail::mailings() {
    auto const end = std::chrono::steady_clock::now() + std::chrono::minutes(2);
    Ended listed;
    do
        listed = service_.vlmail({"status", "--json"});
    while (isSaid(listed.out, "\"state\":\"accepted\"") && std::chrono::steady_clock::now() < end);
    if (listed.status != 0)
        find("does not tell which mailings there are: " + listed.err);
    std::vector<std::string> const ids = idsIn(listed.out);
    return {ids.begin(), ids.end()};
}

} // namespace Faults
