#include "programs/vlmail/mailings/outgoing_mailing.h"

#include "programs/base/error.h"
#include "programs/base/hex.h"
#include "programs/mailing/container_writer.h"
#include "programs/mailing/pack_database.h"
#include "programs/vlmail/mailings/pack_delivery.h"
#include "programs/vlmail/service/service_client.h"

#include <iomanip>
#include <optional>
#include <random>
#include <sstream>
#include <utility>

namespace VlMail {
namespace {

namespace fs = std::filesystem;

constexpr char const* MAILING_ENDING = ".mailing";

class MailingFile : public OutgoingMailing {
public:
    MailingFile(fs::path const& folder, Cfg::PackPreset const& preset, std::time_t now)
        : MailingFile(folder, preset, now, newMailingId(now)) {}

    MailingBuilder& builder() override { return builder_; }

    void finish() override {
        container_.finish(builder_.finish().toBlob(), "make room on the disk and mail again");
    }

    std::string id() const override { return builder_.metadata().id; }
    std::string place() const override { return container_.target().string(); }

private:
    MailingFile(fs::path const& folder, Cfg::PackPreset const& preset, std::time_t now, std::string const& id)
        : container_(folder / (id + MAILING_ENDING), id), builder_(container_, id, preset, now) {}

    Mailing::ContainerWriter container_;
    MailingBuilder builder_;
};

class SentMailing : public OutgoingMailing {
public:
    SentMailing(ServiceLine& service, fs::path const& database, std::string const& nodeId, bool upload,
                Cfg::PackPreset const& preset, std::time_t now)
        : service_(service), database_(database), upload_(upload), id_(newMailingId(now)),
          pack_(database, {id_, nodeId, preset.title()}), builder_(pack_, id_, preset, now) {}

    MailingBuilder& builder() override { return builder_; }

    void finish() override {
        pack_.store(builder_.finish().toBlob());
        finishPack();
        try {
            deliver();
        } catch (NothingToSend const&) {
            Mailing::removePack(database_, id_);
            throw;
        }
    }
    std::vector<LeftOut> leftOut() const override { return leftOut_; }

    std::string id() const override { return id_; }

    std::string place() const override { return id_ + ", " + state_; }

private:
    void deliver() {
        auto const noteLeftOut = [this](long long number, std::string const& why) {
            leftOut_.push_back({static_cast<std::size_t>(number - 1), why});
        };
        state_ = Protocol::stateName(deliverPack(service_, database_, id_, upload_, {}, noteLeftOut).state);
    }

    /// What an earlier run has left of the same letters goes in its place, under the id that the service may
    /// know already. Of two packs with them each could be sent, so that there is never a second one.
    void finishPack() {
        std::optional<std::string> const left = samePackLeftBehind(database_, id_);
        if (!left)
            return pack_.finish();
        pack_.drop();
        id_ = *left;
    }

    ServiceLine& service_;
    fs::path database_;
    bool upload_;
    std::string id_;
    std::string state_;
    std::vector<LeftOut> leftOut_;
    Mailing::PackDatabaseWriter pack_;
    MailingBuilder builder_;
};

class PlannedMailing : public OutgoingMailing {
public:
    explicit PlannedMailing(Cfg::PackPreset const& preset) : builder_(nowhere_, {}, preset, 0) {}

    MailingBuilder& builder() override { return builder_; }
    void finish() override { builder_.finish(); }
    std::string id() const override { return {}; }
    std::string place() const override { return {}; }

private:
    struct Nowhere : PageSaverI {
        Nowhere() : PageSaverI({}) {}
        void savePage(std::string const&, std::string const&, SharedMemBuffer) override {}
    };

    Nowhere nowhere_;
    MailingBuilder builder_;
};

enum class ForOwner { Alone, AndOthers };

void makeFolder(fs::path const& folder, ForOwner forOwner, char const* remedy) {
    std::error_code failure;
    bool const isNew = fs::create_directories(folder, failure);
    if (isNew && forOwner == ForOwner::Alone)
        fs::permissions(folder, fs::perms::owner_all, failure);
    if (failure)
        throw Base::Error(Base::Code::FileUnwritable, "cannot make the folder \"" + folder.string() +
                                                          "\": " + failure.message() + "; " + remedy);
}

} // namespace

OutgoingMailing::~OutgoingMailing() = default;

BeginMailing mailingsIntoFolder(fs::path const& folder) {
    makeFolder(folder, ForOwner::AndOthers, "name another with -o");
    return [folder](Cfg::PackPreset const& preset) {
        return std::make_unique<MailingFile>(folder, preset, std::time(nullptr));
    };
}

BeginMailing mailingsToService(ServiceLine& service, std::string const& nodeId, bool upload) {
    fs::path const database = packDatabaseOf(service.client(), nodeId);
    makeFolder(database.parent_path(), ForOwner::Alone,
               "name another in the settings \"db_host\" of the node");
    return [&service, nodeId, upload, database](Cfg::PackPreset const& preset) {
        return std::make_unique<SentMailing>(service, database, nodeId, upload, preset, std::time(nullptr));
    };
}

BeginMailing mailingsNowhere() {
    return [](Cfg::PackPreset const& preset) { return std::make_unique<PlannedMailing>(preset); };
}

std::string newMailingId(std::time_t now) {
    std::tm utc{};
    gmtime_r(&now, &utc);
    std::random_device random;
    std::ostringstream id;
    id << std::put_time(&utc, "%Y%m%dT%H%M%SZ-") << Base::hexNumber(random(), 8);
    return id.str();
}

} // namespace VlMail
