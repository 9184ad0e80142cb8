// vlmail pack: what is in a mailing file, whether it is whole, and what can be saved of it.
#include "programs/vlmail/commands/pack.h"

namespace VlMail {

void addPackCommand(Base::Command const& app, Task& task) {
    Base::Command const pack = app.addCommand("pack", "Looks into mailing files");
    pack.requireCommand();
    addPackListCommand(pack, task);
    addPackVerifyCommand(pack, task);
    addPackExtractCommand(pack, task);
    addPackSalvageCommand(pack, task);
}

} // namespace VlMail
