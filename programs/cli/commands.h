// The commands. Each prints what it has to say, throws Failure (failure.h) when it could not be
// done as a whole, and Interruption (interrupt.h) when a signal ended it.
#ifndef PROGRAMS_CLI_COMMANDS_H_
#define PROGRAMS_CLI_COMMANDS_H_

#include <string>
#include <vector>

#include "cli/exit_status.h"
#include "cli/link_filter.h"
#include "cli/setting_options.h"

namespace cli {

// Links that a command is told to take.
struct NamedLinks {
  std::vector<std::string> texts;  // hashes and "#ID"
  std::vector<std::string> ids;
};

struct CreateOptions {
  SettingOptions settings;
  bool json = false;
  bool quiet = false;
};
ExitStatus Create(const CreateOptions& options);

struct EditOptions {
  NamedLinks links;
  SettingOptions settings;
  bool json = false;
};
// Of several links those that can be changed are; the first problem decides the status.
ExitStatus Edit(const EditOptions& options);

struct SwitchOptions {
  NamedLinks links;
  bool enabled = true;
};
ExitStatus Switch(const SwitchOptions& options);

struct DeleteOptions {
  NamedLinks links;
  bool damaged = false;  // rows that do not load as links, by their numbers
  bool yes = false;
};
// Nothing is deleted unless all of the links are there.
ExitStatus Delete(const DeleteOptions& options);

struct ListOptionValues {
  LinkFilter filter;
  std::string sort = "id";
  bool reverse = false;
  int offset = 0;
  int limit = 0;  // 0: all
  bool json = false;
};
ExitStatus List(const ListOptionValues& options);

struct ShowOptions {
  NamedLinks links;  // one
  bool json = false;
  bool with_private_data = false;
};
ExitStatus Show(const ShowOptions& options);

struct VisitorOptions {
  NamedLinks links;  // one or none
  bool json = false;
};
ExitStatus Sessions(const VisitorOptions& options);
ExitStatus Tokens(const VisitorOptions& options);

struct SignOutOptions {
  NamedLinks links;
  bool json = false;
};
// Of several links those that are there are signed out; the first problem decides the status.
ExitStatus SignOut(const SignOutOptions& options);

struct PurgeOptions {
  std::string owner;
  std::string project;
  bool all_kinds = false;
  bool dry_run = false;
  bool json = false;
};
ExitStatus Purge(const PurgeOptions& options);

struct ExportOptions {
  std::string file;  // empty: not told; "-": standard output
  LinkFilter filter;
  bool force = false;
};
ExitStatus Export(const ExportOptions& options);

struct ImportOptions {
  std::string file = "-";
  std::string on_conflict = "fail";  // or "skip", "replace"
  bool dry_run = false;
  bool json = false;
};
ExitStatus Import(const ImportOptions& options);

struct CheckOptions {
  bool json = false;
};
ExitStatus Check(const CheckOptions& options);

struct BackupOptions {
  std::string file;
  bool force = false;
};
ExitStatus Backup(const BackupOptions& options);

struct UnblockOptions {
  std::vector<std::string> addresses;
};
ExitStatus Unblock(const UnblockOptions& options);

}  // namespace cli

#endif  // PROGRAMS_CLI_COMMANDS_H_
