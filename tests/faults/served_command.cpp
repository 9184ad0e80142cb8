#include "tests/faults/served_command.h"

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <regex>
#include <utility>

namespace Faults {
namespace {

constexpr char const* SET = "settings_set";
constexpr char const* SEND = "mail_send";

std::vector<std::string> idsIn(std::string const& json) {
    static std::regex const id("\"id\":\"([^\"]*)\"");
    std::vector<std::string> ids;
    for (std::sregex_iterator found(json.begin(), json.end(), id), end; found != end; ++found)
        ids.push_back((*found)[1]);
    return ids;
}

bool isSaid(std::string const& text, std::string const& part) { return text.find(part) != std::string::npos; }

} // namespace

std::vector<std::string> const ServedCommand::NAMES{SET, SEND};

ServedCommand::ServedCommand(std::string name) : name_(std::move(name)) {
    std::filesystem::create_directory(folder_);
    std::ofstream(folder_ / "letter.txt") << "Dear Mr Smith,\nhello.\n";
}

long ServedCommand::callsOf(std::string const& call) { return runOnce({call, 1, 0, false}).calls; }

std::vector<std::string> ServedCommand::run(Fault const& fault) {
    before_ = mailings();
    Ended const ended = runOnce(fault);
    checkEnd(fault, ended);
    name_ == SET ? checkSetting(ended) : checkMailing(ended);
    return std::exchange(findings_, {});
}

Ended ServedCommand::vlmail(std::vector<std::string> arguments, Fault const& fault) const {
    for (std::string const& more : {std::string("--service"), "127.0.0.1:" + std::to_string(service_.port()),
                                    std::string("--token"), (data_ / "token").string()})
        arguments.push_back(more);
    // Where the client keeps mailings until the service has them.
    return runWith(fault, VLMAIL_PROGRAM, arguments, {folder_, {{"XDG_DATA_HOME", root_ / "home"}}});
}

Ended ServedCommand::runOnce(Fault const& fault) {
    if (name_ == SET)
        return vlmail({"settings", "set", "a=acme", "po", "code=R-" + std::to_string(++value_) + '.'}, fault);
    return vlmail({"mail", "letter.txt", "--send", "--node", "a=acme", "--jobs", "1"}, fault);
}

void ServedCommand::checkEnd(Fault const& fault, Ended const& ended) {
    if (ended.isLate)
        find("does not end within two minutes");
    if (ended.status < 0 && !fault.kills())
        find("dies of signal " + std::to_string(-ended.status));
    if (ended.status > 0 && !isSaid(ended.err + ended.out, "vlmail: "))
        find("fails without a line that says why: " + ended.out + ended.err);
}

void ServedCommand::checkSetting(Ended const& ended) {
    std::string const shown = vlmail({"settings", "show", "a=acme", "po"}).out;
    bool const isSet = isSaid(shown, "R-" + std::to_string(value_) + '.');
    if (ended.status == 0 && !isSet)
        find("says that a setting is set, and it is not: " + shown);
    // One that failed behind the service's answer leaves the new value.
    if (!isSet && value_ > 1 && !isSaid(shown, "R-"))
        find("loses the setting that was there: " + shown);
}

void ServedCommand::checkMailing(Ended const& ended) {
    if (ended.status == 0 && mailings().size() != before_.size() + 1)
        find("says that a mailing was sent, and it is not there: " + ended.out);
    resumeStranded();
    std::multiset<std::string> const after = mailings();
    if (after.size() > before_.size() + 1 ||
        std::set<std::string>(after.begin(), after.end()).size() != after.size())
        find("sends a mailing twice");
    for (std::string const& id : after)
        if (!before_.contains(id) &&
            !isSaid(runWith({}, VLMAIL_PROGRAM,
                            {"pack", "verify", (data_ / "outbox" / (id + ".mailing")).string()}, {folder_})
                        .out,
                    "all whole"))
            find("sends the mailing " + id + ", which is not whole");
}

void ServedCommand::resumeStranded() {
    Ended const stranded = vlmail({"status", "--stranded", "--node", "a=acme", "--json"});
    for (std::string const& id : idsIn(stranded.out))
        if (Ended const ended = vlmail({"resume", id, "--node", "a=acme"}); ended.status != 0)
            find("leaves the mailing " + id + ", which cannot be resumed: " + ended.err);
}

std::multiset<std::string> ServedCommand::mailings() const {
    auto const end = std::chrono::steady_clock::now() + std::chrono::minutes(2);
    std::string listed;
    do
        listed = vlmail({"status", "--json"}).out;
    while (isSaid(listed, "\"state\":\"accepted\"") && std::chrono::steady_clock::now() < end);
    std::vector<std::string> const ids = idsIn(listed);
    return {ids.begin(), ids.end()};
}

} // namespace Faults
