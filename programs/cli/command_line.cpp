#include "cli/command_line.h"

#include <CLI/App.hpp>
#include <CLI/Config.hpp>
#include <CLI/Formatter.hpp>
#include <algorithm>
#include <charconv>
#include <iostream>
#include <memory>

#include "cli/commands.h"
#include "cli/failure.h"
#include "cli/separate_words.h"
#include "cli/setting_options.h"

namespace cli {

namespace {

using Action = std::function<ExitStatus()>;

constexpr const char* kLinkHelp = "The link's hash, or #ID";

// Commands put what is to be done into `action`; their options live as long as that.
class Builder {
 public:
  Builder(CLI::App* app, Action* action) : app_(app), action_(action) {}

  // The new command runs `run` with the options.
  template <typename Options>
  CLI::App* Add(const char* name, const char* help, ExitStatus (*run)(const Options&),
                const std::shared_ptr<Options>& options) {
    CLI::App* command = app_->add_subcommand(name, help);
    command->callback(
        [action = action_, run, options] { *action = [run, options] { return run(*options); }; });
    return command;
  }

 private:
  CLI::App* app_;
  Action* action_;
};

// The value as it was typed: the library's own conversions know brackets and braces.
CLI::callback_t Keep(const std::function<void(const std::string&)>& keep) {
  return [keep](const CLI::results_t& results) {
    keep(results.front());
    return true;
  };
}

// An empty text is somebody's unset variable more often than it is meant: a purge of "" must not be
// one of everything.
void AddText(CLI::App* command, const std::string& name, std::string* text, const char* value,
             const char* help) {
  const auto take = [name, text](const std::string& given) {
    if (given.empty()) {
      throw Failure(ExitStatus::kUsage, name + ": must not be empty");
    }
    *text = given;
  };
  command->add_option(name, Keep(take), help)->type_name(value);
}

// Decimal digits, as everywhere: 010 is ten.
void AddNumber(CLI::App* command, const char* name, int* number, const char* help) {
  const auto take = [name, number](const std::string& text) {
    const char* end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, *number);
    if (error != std::errc() || stop != end) {
      throw Failure(ExitStatus::kUsage, std::string(name) + ": must be a whole number");
    }
  };
  command->add_option(name, Keep(take), help)->type_name("N");
}

void AddLinks(CLI::App* command, NamedLinks* links) {
  command->add_option("LINK", links->texts, kLinkHelp)->type_name("");
  command->add_option("--id", links->ids, "A link by its row number")
      ->type_name("ID")
      ->allow_extra_args(false);
}

void AddFilter(CLI::App* command, LinkFilter* filter) {
  AddText(command, "--owner", &filter->owner, "USER", "Links of this account");
  AddText(command, "--project", &filter->project, "NAME", "Links of this application");
  AddText(command, "--state", &filter->state, "STATE",
          "Links that are disabled, expired, used_up, not_yet or live");
  AddText(command, "--search", &filter->search, "TEXT",
          "Links with this in hash, project or title");
}

void AddJson(CLI::App* command, bool* json) {
  command->add_flag("--json", *json, "Print JSON");
}

void AddFileName(CLI::App* command, const char* name, std::optional<std::string>* text,
                 const char* help) {
  command->add_option(name, Keep([text](const std::string& value) { *text = value; }), help)
      ->type_name("FILE");
}

// "a,b" and repeated options alike; an empty one makes the list empty.
void AddNames(CLI::App* command, const ValueOption& option, SettingOptions* settings) {
  const auto take = [settings, argument = option.argument](const CLI::results_t& results) {
    Json::Value names(Json::arrayValue);
    for (const std::string& result : results) {
      for (const std::string& name : CLI::detail::split(result, ',')) {
        if (!name.empty()) {
          names.append(name);
        }
      }
    }
    settings->values[argument] = names;
    return true;
  };
  command->add_option(option.name, CLI::callback_t(take), option.help)
      ->type_name(option.value)
      ->type_size(1)
      ->expected(1)
      ->multi_option_policy(CLI::MultiOptionPolicy::TakeAll)
      ->allow_extra_args(false);
}

void Exclude(CLI::App* command, const char* one, const char* other) {
  command->get_option(one)->excludes(command->get_option(other));
}

void AddPassword(CLI::App* command, SettingOptions* settings) {
  command->add_flag(kPasswordOption, settings->ask_password,
                    "Ask for a password, twice, on the terminal");
  command->add_flag(kPasswordStdinOption, settings->password_from_input,
                    "Take a line of standard input as the password");
  Exclude(command, kPasswordOption, kPasswordStdinOption);
}

void AddSettings(CLI::App* command, SettingOptions* settings) {
  for (const ValueOption& option : ValueOptions()) {
    command
        ->add_option(option.name, Keep([settings, name = option.argument](const std::string& text) {
                       settings->texts[name] = text;
                     }),
                     option.help)
        ->type_name(option.value);
  }
  for (const ValueOption& option : ListOptions()) {
    AddNames(command, option, settings);
  }
  for (const FlagOption& option : FlagOptions()) {
    command->add_flag_callback(
        option.name, [settings, option] { settings->values[option.argument] = option.stands_for; },
        option.help);
  }
  AddFileName(command, kPathOption, &settings->path, "The file of a link of the project \"file\"");
  AddFileName(command, kAppFileOption, &settings->app_file, "The application's data, from a file");
  AddFileName(command, kPrivateDataFileOption, &settings->private_data_file,
              "The private data, from a file");
  AddPassword(command, settings);
  Exclude(command, "--enabled", "--disabled");
  Exclude(command, "--auto-gc", "--no-auto-gc");
  Exclude(command, "--match-ip", "--no-match-ip");
  Exclude(command, "--app", kAppFileOption);
  Exclude(command, "--private-data", kPrivateDataFileOption);
}

void AddCreate(Builder builder) {
  auto options = std::make_shared<CreateOptions>();
  CLI::App* command = builder.Add("create", "Make a link", Create, options);
  AddSettings(command, &options->settings);
  AddJson(command, &options->json);
  command->add_flag("-q,--quiet", options->quiet, "Print the hash alone");
  Exclude(command, "--json", "--quiet");
}

void AddEdit(Builder builder) {
  auto options = std::make_shared<EditOptions>();
  CLI::App* command = builder.Add("edit", "Change links; what is not told stays", Edit, options);
  AddLinks(command, &options->links);
  AddSettings(command, &options->settings);
  command->add_flag(kNoPasswordOption, options->settings.no_password,
                    "Forget the password; a link that asked for it is open then");
  Exclude(command, kNoPasswordOption, kPasswordOption);
  Exclude(command, kNoPasswordOption, kPasswordStdinOption);
  AddJson(command, &options->json);
}

void AddSwitch(Builder builder, const char* name, const char* help, bool enabled) {
  auto options = std::make_shared<SwitchOptions>();
  options->enabled = enabled;
  AddLinks(builder.Add(name, help, Switch, options), &options->links);
}

void AddDelete(Builder builder) {
  auto options = std::make_shared<DeleteOptions>();
  CLI::App* command = builder.Add("delete", "Delete links", Delete, options);
  AddLinks(command, &options->links);
  command->add_flag("--damaged", options->damaged,
                    "Delete damaged rows, by the numbers that check tells");
  command->add_flag("-y,--yes", options->yes, "Do not ask");
}

void AddList(Builder builder) {
  auto options = std::make_shared<ListOptionValues>();
  CLI::App* command = builder.Add("list", "List links", List, options);
  AddFilter(command, &options->filter);
  AddText(command, "--sort", &options->sort, "COLUMN",
          "id, hash, project_name, owner_uid, enabled, start_at, expire_at, expire_times or "
          "use_count");
  command->add_flag("--reverse", options->reverse, "The last ones first");
  AddNumber(command, "--offset", &options->offset, "Leave out the first N");
  AddNumber(command, "--limit", &options->limit, "At most N; 0, as without it, for all");
  AddJson(command, &options->json);
}

void AddShow(Builder builder) {
  auto options = std::make_shared<ShowOptions>();
  CLI::App* command = builder.Add("show", "Show a link", Show, options);
  AddLinks(command, &options->links);
  AddJson(command, &options->json);
  command->add_flag("--private", options->with_private_data, "With the private data");
}

void AddVisitors(Builder builder) {
  auto sessions = std::make_shared<VisitorOptions>();
  CLI::App* command = builder.Add("sessions", "Visitors, or those of a link", Sessions, sessions);
  AddLinks(command, &sessions->links);
  AddJson(command, &sessions->json);
  auto tokens = std::make_shared<VisitorOptions>();
  command = builder.Add("tokens", "Who is admitted to which link", Tokens, tokens);
  AddLinks(command, &tokens->links);
  AddJson(command, &tokens->json);
}

void AddSignOut(Builder builder) {
  auto options = std::make_shared<SignOutOptions>();
  CLI::App* command =
      builder.Add("signout", "End the admission of everybody who is in", SignOut, options);
  AddLinks(command, &options->links);
  AddJson(command, &options->json);
}

void AddPurge(Builder builder) {
  auto options = std::make_shared<PurgeOptions>();
  CLI::App* command =
      builder.Add("purge", "Delete links that are past their end or used up", Purge, options);
  AddText(command, "--owner", &options->owner, "USER", "Links of this account");
  AddText(command, "--project", &options->project, "NAME", "Links of this application");
  command->add_flag("--all-kinds", options->all_kinds, "Expired sessions and tokens as well");
  command->add_flag("--dry-run", options->dry_run, "Only count");
  AddJson(command, &options->json);
}

void AddTransfer(Builder builder) {
  auto exported = std::make_shared<ExportOptions>();
  CLI::App* command =
      builder.Add("export", "Write links, with their secrets, to a file", Export, exported);
  AddText(command, "FILE", &exported->file, "", "The new file; - for standard output");
  AddFilter(command, &exported->filter);
  command->add_flag("--force", exported->force, "Replace a file that is there");
  auto imported = std::make_shared<ImportOptions>();
  command = builder.Add("import", "Take links from a file that export has written: all or none",
                        Import, imported);
  AddText(command, "FILE", &imported->file, "", "The file; - or nothing for standard input");
  AddText(command, "--on-conflict", &imported->on_conflict, "POLICY",
          "When a hash is taken: fail, skip or replace");
  command->add_flag("--dry-run", imported->dry_run, "Only try");
  AddJson(command, &imported->json);
}

void AddUpkeep(Builder builder) {
  auto checked = std::make_shared<CheckOptions>();
  AddJson(builder.Add("check", "Look for damage", Check, checked), &checked->json);
  auto backed_up = std::make_shared<BackupOptions>();
  CLI::App* command = builder.Add("backup", "Copy the whole database", Backup, backed_up);
  AddText(command, "FILE", &backed_up->file, "", "The new file");
  command->get_option("FILE")->required();
  command->add_flag("--force", backed_up->force, "Replace a file that is there");
  auto unblocked = std::make_shared<UnblockOptions>();
  command = builder.Add("unblock", "Let addresses in again that failed to log in too often",
                        Unblock, unblocked);
  command->add_option("ADDRESS", unblocked->addresses, "IPv4 or IPv6")->type_name("")->required();
}

void AddCommands(CLI::App* app, Action* action) {
  const Builder builder(app, action);
  AddCreate(builder);
  AddList(builder);
  AddShow(builder);
  AddEdit(builder);
  AddSwitch(builder, "enable", "Switch links on", true);
  AddSwitch(builder, "disable", "Switch links off", false);
  AddDelete(builder);
  AddPurge(builder);
  AddVisitors(builder);
  AddSignOut(builder);
  AddTransfer(builder);
  AddUpkeep(builder);
}

}  // namespace

std::function<ExitStatus()> ReadCommandLine(int argc, const char* const* argv) {
  Action action;
  CLI::App app("Keeps sharing links. Runs as root or as the system account.", "tuvosharing");
  app.set_version_flag("--version", std::string("tuvosharing ") + TUVOSHARING_VERSION);
  app.require_subcommand(0, 1);
  AddCommands(&app, &action);
  try {
    std::vector<std::string> words = SeparateWords(app, {argv + 1, argv + argc});
    std::reverse(words.begin(), words.end());  // as the reading wants them
    app.parse(words);
  } catch (const CLI::Success& asked) {
    app.exit(asked, std::cout, std::cerr);
    return {};
  } catch (const CLI::ParseError& error) {
    throw Failure(ExitStatus::kUsage, error.what());
  }
  if (!action) {
    throw Failure(ExitStatus::kUsage, "a command is needed; --help lists them");
  }
  return action;
}

}  // namespace cli
