#include "tests/faults/asked_command.h"

#include "tests/vlserviced/pack_help.h"

#include <algorithm>
#include <chrono>
#include <fstream>
#include <iterator>
#include <regex>
#include <utility>

namespace Faults {
namespace {

namespace fs = std::filesystem;
using Arguments = std::vector<std::string>;

/// Ids, times and room differ from run to run, and with them the widths of columns.
std::string lasting(std::string const& text) {
    static std::regex const time(
        "[0-9]{4}/[0-9]{2}/[0-9]{2} [0-9:]{8}|stored[0-9]+|room for "
        "[^\n]*|[0-9]+ MiB left|[0-9a-f]{16}\\.[0-9a-f]{64}|\"(accepted|changed)\":[0-9]+");
    static std::regex const blanks(" +");
    return std::regex_replace(std::regex_replace(withoutIds(text), time, "TIME"), blanks, " ");
}

/// Settings of this line, made with a command of their own.
auto after(Arguments const& arguments) {
    return [arguments](ServiceAtHand const& service) {
        service.vlmail(arguments);
        return std::string();
    };
}

std::string mailed(ServiceAtHand const& service) {
    static std::regex const id("[0-9]{8}T[0-9]{6}Z-[0-9a-f]{8}");
    std::string const out = service
                                .vlmail({"mail", "letter.txt", "--send", "--again", "a further try", "--node",
                                         "a=acme", "--jobs", "1"})
                                .out;
    std::smatch found;
    return std::regex_search(out, found, id) ? found.str() : "";
}

auto mailedAnd(std::string const& action) {
    return [action](ServiceAtHand const& service) {
        std::string const id = mailed(service);
        service.vlmail({action, id});
        return id;
    };
}

/// In the pack database, as one whose way to the service was cut off. It does not ask to be handed on.
std::string stranded(ServiceAtHand const& service) {
    static int number = 0;
    std::string const id = "stored" + std::to_string(++number);
    storePack(service.packDatabase(), id, "a=acme", R"("process_mode": 0, )");
    return id;
}

constexpr char const* FILE_AT_HAND = "../home/vlmail/out/m.mailing";

/// Finished in a file, and with no service yet.
std::string inAFile(ServiceAtHand const& service) {
    fs::path const file = service.folder() / FILE_AT_HAND;
    fs::remove_all(file.parent_path());
    service.vlmail({"mail", "letter.txt", "-o", file.parent_path().string(), "--jobs", "1"});
    fs::path const made = fs::directory_iterator(file.parent_path())->path();
    fs::rename(made, file);
    return made.stem().string();
}

std::string withUploadFolder(ServiceAtHand const& service) {
    fs::path const upload = service.packDatabase().parent_path() / "upload";
    fs::create_directory(upload);
    service.vlmail({"settings", "service", "upload_folder=" + upload.string()});
    return "";
}

/// The service has it and does not hand it on yet.
std::string waiting(ServiceAtHand const& service) {
    service.vlmail({"settings", "suspend", "nothing"});
    withUploadFolder(service);
    std::string const id = stranded(service);
    service.vlmail({"resume", id, "--node", "a=acme"});
    service.vlmail({"settings", "suspend", "jobs"});
    return id;
}

Arguments const SHOW{"settings", "show", "a=acme", "po"};
Arguments const SET{"settings", "set", "a=acme", "po", "code=R-1."};
Arguments const RESET{"settings", "reset", "a=acme", "po", "code"};
Arguments const PUT{"documents", "put", "head", "letter.txt", "--node", "a=acme"};
Arguments const REMOVE{"documents", "remove", "head", "--node", "a=acme"};
Arguments const CARRIERS{"carriers", "list"};
Arguments const ADD_TOKEN{"token", "add", "office", "--role", "send", "--node", "a=acme"};
Arguments const REVOKE_TOKEN{"token", "revoke", "office"};
Arguments const LIST_TOKENS{"token", "list"};
Arguments const LIST{"documents", "list", "--node", "a=acme"};

std::string withNode(ServiceAtHand const& service) {
    service.vlmail(SET);
    service.vlmail(REMOVE);
    return "";
}

std::string withoutToken(ServiceAtHand const& service) {
    service.vlmail(REVOKE_TOKEN);
    return "";
}

std::string withDocument(ServiceAtHand const& service) {
    service.vlmail(SET);
    service.vlmail(PUT);
    fs::remove(service.folder() / "head.txt");
    return "";
}

/// The files of a folder with what they hold.
std::string filesIn(fs::path const& folder) {
    std::vector<std::string> files;
    for (fs::directory_entry const& entry : fs::recursive_directory_iterator(folder)) {
        std::ifstream in(entry.path(), std::ios::binary);
        files.push_back(entry.path().filename().string() + ": " +
                        std::string(std::istreambuf_iterator<char>(in), {}) + '\n');
    }
    std::ranges::sort(files);
    std::string all;
    for (std::string const& file : files)
        all += file;
    return all;
}

bool isHidden(fs::path const& file) { return file.filename().string().starts_with('.'); }

/// What only a program that is killed, or may not remove it, leaves.
void removeHidden(fs::path const& folder) {
    std::vector<fs::path> hidden;
    for (fs::directory_entry const& entry : fs::directory_iterator(folder))
        if (isHidden(entry.path()))
            hidden.push_back(entry.path());
    for (fs::path const& file : hidden)
        fs::remove(file);
}

bool leavesHiddenFiles(Fault const& fault) { return fault.kills() || fault.call == "remove"; }

std::string withCarrier(ServiceAtHand const& service) {
    fs::path const shop = service.packDatabase().parent_path() / "shop";
    fs::create_directory(shop);
    service.vlmail({"settings", "service",
                    R"(carriers={"postal":{"type":"folder","folder":")" + shop.string() + "\"}}"});
    // From then on it is told since when it works.
    service.vlmail({"carriers", "pause", "postal"});
    service.vlmail({"carriers", "resume", "postal"});
    return "";
}

std::string withPausedCarrier(ServiceAtHand const& service) {
    withCarrier(service);
    service.vlmail({"carriers", "pause", "postal"});
    return "";
}

} // namespace

std::vector<Question> const& questions() {
    static std::vector<Question> const all{
        {"carriers_list", CARRIERS, &withCarrier},
        {"carriers_pause", {"carriers", "pause", "postal"}, &withCarrier, CARRIERS},
        {"carriers_resume", {"carriers", "resume", "postal"}, &withPausedCarrier, CARRIERS},
        {"carriers_test", {"carriers", "test", "postal"}, &withCarrier},
        {"discover", {"discover"}},
        {"doctor", {"doctor"}, &withUploadFolder},
        {"documents_get", {"documents", "get", "head", "head.txt", "--node", "a=acme"}, &withDocument, LIST},
        {"documents_list", LIST},
        {"documents_put", PUT, &withNode, LIST},
        {"documents_remove", REMOVE, &withDocument, LIST},
        {"history", {"history", "--node", "a=nobody"}},
        {"hold", {"hold", "{}"}, &mailed, {"status", "{}"}},
        {"release", {"release", "{}"}, mailedAnd("hold"), {"status", "{}"}},
        {"cancel", {"cancel", "{}"}, &mailed, {"status", "{}"}},
        {"price",
         {"price", "20x3"},
         [](ServiceAtHand const& service) {
             std::ofstream(service.folder() / "t.json") << R"({"currency":"EUR","letter":85,"sheet":10})";
             return after({"settings", "service", "tariff=t.json"})(service);
         }},
        {"settings_impact",
         {"settings", "impact", "a=acme", "po", "own.json"},
         [](ServiceAtHand const& service) {
             std::ofstream(service.folder() / "own.json") << R"({"code":"R-7."})";
             return std::string();
         }},
        {"settings_ids", {"settings", "ids"}},
        {"settings_remove",
         {"settings", "remove", "a=gone"},
         after({"settings", "set", "a=gone", "po", "code=R-1."}),
         {"settings", "tree"}},
        {"settings_reset", RESET, after(SET), SHOW},
        {"settings_service",
         {"settings", "service", "disabled=[\"a=gone\"]"},
         after({"settings", "service", "disabled="}),
         {"settings", "service"}},
        {"settings_set", SET, after(RESET), SHOW},
        {"settings_show", SHOW},
        {"settings_suspend",
         {"settings", "suspend", "jobs"},
         after({"settings", "suspend", "nothing"}),
         {"settings", "service"}},
        {"settings_tree", {"settings", "tree"}},
        {"resend", {"resend", "{}", "1"}, &mailed, {"status", "{}"}, Expected::Refused},
        {"send", {"send", FILE_AT_HAND}, &inAFile, {"status", "{}"}},
        {"bounce", {"bounce", "--maildir", "."}, {}, {}, Expected::Refused},
        {"settle", {"settle", "{}", "1", "failed"}, &mailed, {"status", "{}"}, Expected::Refused},
        {"status", {"status"}},
        {"discard",
         {"discard", "{}", "--node", "a=acme"},
         &stranded,
         {"status", "--stranded", "--node", "a=acme"}},
        {"resume", {"resume", "{}", "--node", "a=acme"}, &stranded, {"status", "{}"}},
        {"token_add", ADD_TOKEN, &withoutToken, LIST_TOKENS},
        {"token_list", LIST_TOKENS},
        {"token_revoke", REVOKE_TOKEN, after(ADD_TOKEN), LIST_TOKENS},
        {"upload", {"upload"}, &waiting, {"status", "{}", "--json"}},
    };
    return all;
}

AskedCommand::AskedCommand(Question question) : question_(std::move(question)) {
    clean_ = runOnce({});
    state_ = after_ = state();
    bool const isRefused = question_.expected == Expected::Refused;
    if ((clean_.status != 0) != isRefused)
        find("fails though nothing is made to fail: " + clean_.err);
    if (question_.prepare && !question_.look.empty() && !isRefused && after_ == before_)
        find("changes nothing that is looked at: " + before_);
}

std::vector<std::string> AskedCommand::run(Fault const& fault) {
    Ended ended = runOnce(fault);
    bool const mayBeDone = ended.status == clean_.status;
    if (mayBeDone && unseen_ > 0) {
        // What it found may be what one before it has left.
        checkState(false);
        ended = runOnce(fault);
    }
    for (std::string const& wrong : faultsInEnd(fault, ended))
        find(wrong);
    bool const isFine = ended.status == clean_.status;
    if (ended.status > 0 && !saysWhy(ended.err) && ended.out == clean_.out)
        find("fails without a line that says why");
    if (isFine && ended.out != clean_.out)
        find("says that all went well and prints something else: " + ended.out);
    if (leavesHiddenFiles(fault))
        removeHidden(service_.folder());
    if (isFine || ++unseen_ == LOOK_EVERY)
        checkState(isFine);
    return std::exchange(findings_, {});
}

void AskedCommand::checkState(bool isDone) {
    unseen_ = 0;
    state_ = state();
    if (isDone && state_ != after_)
        find("says that it is done: " + state_);
    if (!isDone && state_ != before_ && state_ != after_)
        find("or one shortly before it leaves what is neither done nor not: " + state_);
}

void AskedCommand::prepare() {
    if (question_.prepare)
        mailing_ = question_.prepare(service_);
    state_ = state();
    if (!std::exchange(isPrepared_, true))
        before_ = state_;
    if (state_ != before_)
        find("is not prepared: " + state_);
}

Ended AskedCommand::runOnce(Fault const& fault) {
    if (!isPrepared_ || state_ != before_)
        prepare();
    Ended ended = service_.vlmail(named(question_.arguments), fault);
    ended.out = lasting(ended.out);
    return ended;
}

Arguments AskedCommand::named(Arguments arguments) const {
    std::ranges::replace(arguments, "{}", mailing_);
    return arguments;
}

std::string AskedCommand::state() const {
    if (question_.look.empty())
        return "";
    auto const end = std::chrono::steady_clock::now() + std::chrono::minutes(2);
    Ended look;
    do
        look = service_.vlmail(named(question_.look));
    while (look.out.find(" accepted ") != std::string::npos && std::chrono::steady_clock::now() < end);
    return lasting(look.out + look.err) + filesIn(service_.folder());
}

} // namespace Faults
