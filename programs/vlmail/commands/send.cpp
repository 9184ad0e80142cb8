// vlmail send: finished mailing files to the service.
#include "programs/base/error.h"
#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/commands/service_options.h"
#include "programs/vlmail/commands/settings.h"
#include "programs/vlmail/mailings/edited_pack.h"
#include "programs/vlmail/mailings/pack_delivery.h"
#include "programs/vlmail/pack/container_pack.h"
#include "programs/vlmail/terminal/progress.h"
#include "vlservice/json/json_text.h"

#include <memory>
#include <ostream>
#include <string>
#include <vector>

namespace VlMail {
namespace {

struct Options {
    std::vector<std::string> files;
    std::string node = "/";
    bool upload = false;
    bool json = false;
    std::string again;
    ServiceOptions service;
};

/// What became of the files, as a person and as a program reads it.
class Outgoing {
public:
    explicit Outgoing(Options const& options, Terminal const& terminal)
        : options_(options), terminal_(terminal) {}

    void send(ServiceLine& service, std::string const& file) {
        try {
            auto const pack = ContainerPack::open(file, nodeIdIn(options_.node));
            if (options_.again.empty())
                return tell(file, deliver(service, *pack));
            tell(file, deliver(service, *EditedPack::again(*pack, options_.again)));
        } catch (NothingToSend const&) {
            // Which letters stay behind is told of each.
        } catch (Base::Error const& failure) {
            failures_.append(json::Object{
                {"file", file}, {"reason", failure.what()}, {"code", Base::nameOf(failure.code())}});
            terminal_.complain(failure);
        }
    }
    int finish() const {
        if (options_.json)
            terminal_.out << toJson() << '\n';
        if (failures_.size() > 0)
            return FAILED;
        return leftOut_.size() > 0 ? INCOMPLETE : FINE;
    }

private:
    Protocol::JobReport deliver(ServiceLine& service, Mailing::PackSource& pack) {
        UploadLine line(terminal_, pack.packId());
        return deliverPack(
            service, pack, options_.upload, [&](long long done, long long all) { line.show(done, all); },
            [&](long long number, std::string const& why) { tellLeftOut(pack.packId(), number, why); });
    }

    void tellLeftOut(std::string const& packId, long long number, std::string const& why) {
        leftOut_.append(json::Object{{"id", packId}, {"letter", number}, {"reason", why}});
        if (!options_.json)
            terminal_.out << "left out: " << packId << ", letter " << number << ": " << why << '\n';
    }

    json::Object toJson() const {
        json::Object object{{"mailings", sent_}, {"failures", failures_}};
        if (leftOut_.size() > 0)
            object.set("left_out", leftOut_);
        return object;
    }

    void tell(std::string const& file, Protocol::JobReport const& job) {
        sent_.append(json::Object{{"file", file}, {"id", job.id}, {"state", stateName(job.state)}});
        if (!options_.json)
            terminal_.out << job.id << ", " << stateName(job.state) << '\n';
    }

    Options const& options_;
    Terminal const& terminal_;
    json::Array sent_;
    json::Array failures_;
    json::Array leftOut_;
};

int sendFiles(Options const& options, Terminal const& terminal) {
    ServiceLine service = lineToService(options.service, terminal);
    Outgoing outgoing(options, terminal);
    for (std::string const& file : options.files)
        outgoing.send(service, file);
    return outgoing.finish();
}

} // namespace

void addSendCommand(Base::Command const& app, Task& task) {
    auto const options = std::make_shared<Options>();
    Base::Command const send = app.addCommand(
        "send", "Sends finished mailing files to the service; again, it goes on and never sends "
                "one twice");
    send.addOption("FILE", options->files, "Mailing files").required();
    send.addOption("--node", options->node, "The node to send for").showDefault();
    send.addFlag("--upload", options->upload, "Has the service hand the mailings on at once");
    send.addOption("--again", options->again,
                   "Sends letters that went out before, too, for this reason, which goes on record");
    send.addFlag("--json", options->json, "The outcome as one JSON object");
    addServiceOptions(send, options->service);
    send.whenNamed(
        [=, &task] { task = [=](Terminal const& terminal) { return sendFiles(*options, terminal); }; });
}

} // namespace VlMail
