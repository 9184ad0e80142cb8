#include "programs/base/error.h"
#include "programs/carriers/carrier.h"
#include "programs/carriers/command_carrier.h"
#include "programs/carriers/folder_carrier.h"
#include "programs/carriers/printer_carrier.h"
#include "programs/carriers/sftp_carrier.h"
#include "programs/carriers/smtp_carrier.h"

namespace Carriers {

std::unique_ptr<Carrier> makeCarrier(Protocol::CarrierSettings const& settings, StopSign const& stop) {
    switch (settings.type) {
    case Protocol::CarrierType::Folder:
        return std::make_unique<FolderCarrier>(settings.folder, settings.folderIdentity);
    case Protocol::CarrierType::Sftp:
        return std::make_unique<SftpCarrier>(settings, stop);
    case Protocol::CarrierType::Printer:
        return std::make_unique<PrinterCarrier>(settings.uri, stop);
    case Protocol::CarrierType::Command:
        return std::make_unique<CommandCarrier>(settings);
    case Protocol::CarrierType::Smtp:
        return std::make_unique<SmtpCarrier>(settings, stop);
    }
    throw Base::Error(Base::Code::CarrierUnknown, "there is no such carrier");
}

} // namespace Carriers
