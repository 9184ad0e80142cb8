#pragma once
// The subcommands below "vlmail settings".

#include "programs/vlmail/commands/command.h"
#include "programs/vlmail/service/service_client.h"
#include "vlservice/json/json.h"

#include <string>
#include <vector>

namespace VlMail {

// Each adds its subcommand to `settings`. One source file a subcommand, but for those that are a few lines.
void addSettingsShowCommand(Base::Command const& settings, Task& task);
void addSettingsTreeCommand(Base::Command const& settings, Task& task);
/// set, reset and remove.
void addSettingsChangeCommands(Base::Command const& settings, Task& task);
/// The settings of the service itself, and what it holds back.
void addSettingsServiceCommands(Base::Command const& settings, Task& task);

/// The id of a node as a person writes it: "/" is the root, a path with types (u=bob/a=acme) is taken as it
/// is, and a path of names (bob/sales/acme) is completed.
std::string nodeIdIn(std::string const& text);
/// "the root" or the id.
std::string nodeInWords(std::string const& id);

/// A node's settings as the service answers.
Protocol::SettingsAnswer fetchSettings(Channel::Client& service, std::string const& nodeId,
                                       std::vector<std::string> const& parts);

/// A value as JSON text, a string without its quotes.
std::string valueInWords(json::Value const& value);
/// The value that a text means where a value like `model` stands: a text, or JSON. Throws Error, which names
/// the key, when the text is not JSON.
json::Value valueIn(std::string const& key, std::string const& text, json::Value const& model);
/// A document from a file, or from standard input for "-". Throws Error.
json::Object readDocument(std::string const& file);

} // namespace VlMail
