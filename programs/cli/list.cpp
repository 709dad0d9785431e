// tuvosharing list
#include <tuvosharing/entry.h>
#include <unistd.h>

#include <algorithm>
#include <ctime>
#include <functional>
#include <iostream>

#include "cli/commands.h"
#include "cli/database.h"
#include "cli/failure.h"
#include "cli/interrupt.h"
#include "cli/output.h"
#include "cli/table.h"
#include "cli/terminal.h"
#include "owner/link_json.h"
#include "owner/link_list.h"
#include "owner/moment.h"

namespace cli {

namespace {

using TUVO::sharing::record::Entry;

// Memory stays small, whatever the number of links.
constexpr int kPiece = 1000;

std::string OwnerText(const Entry& link) {
  const std::string name = link.get_owner_user();
  return name.empty() ? std::to_string(link.get_owner_uid()) : name;
}

std::string UsesText(const Entry& link) {
  const std::string uses = std::to_string(link.get_use_count());
  return link.get_expire_times() > 0 ? uses + " of " + std::to_string(link.get_expire_times())
                                     : uses;
}

std::string ProtectionText(const Entry& link) {
  switch (link.get_protect_type()) {
    case Entry::PROTECT_NONE:
      return "-";
    case Entry::PROTECT_PASSWORD:
      return "password";
    default:
      return "accounts";
  }
}

Table LinkTable() {
  return Table({{"ID", true, false},
                {"HASH", false, false},
                {"PROJECT", false, true},
                {"OWNER", false, true},
                {"STATE", false, false},
                {"USES", true, false},
                {"EXPIRES", false, false},
                {"ASKS FOR", false, false},
                {"TITLE", false, true}});
}

std::vector<std::string> CellsOf(const Entry& link, std::time_t now) {
  return {std::to_string(link.get_id()),
          link.get_hash(),
          link.get_project_name(),
          OwnerText(link),
          owner::StateText(owner::StateOf(link, now)),
          UsesText(link),
          owner::MomentText(link.get_expire_at()),
          ProtectionText(link),
          link.get_protect_title()};
}

owner::ListRequest PagesOf(const ListOptionValues& options) {
  owner::ListRequest request = RequestOf(options.filter);
  const std::vector<std::string>& columns = owner::SortColumns();
  if (std::find(columns.begin(), columns.end(), options.sort) == columns.end()) {
    std::string text = "--sort: must be one of";
    for (const std::string& column : columns) {
      text += " " + column;
    }
    throw Failure(ExitStatus::kUsage, text);
  }
  if (options.offset < 0 || options.limit < 0) {
    throw Failure(ExitStatus::kUsage, "--offset, --limit: must be at least 0");
  }
  request.sort = options.sort;
  request.descending = options.reverse;
  return request;
}

// Calls `take` for each link of the pages asked for; `begin`, with the total, before the first.
void ForEachLink(const ListOptionValues& options, std::time_t now,
                 const std::function<void(int total)>& begin,
                 const std::function<void(const Entry&)>& take) {
  owner::ListRequest request = PagesOf(options);
  request.offset = options.offset;
  int total = 0;
  bool begun = false;
  for (int done = 0; options.limit == 0 || done < options.limit; done += kPiece) {
    StopIfInterrupted();
    request.limit = options.limit == 0 ? kPiece : std::min(kPiece, options.limit - done);
    std::vector<Entry> links;
    Require(owner::ListLinks(Database(), request, now, &links, &total));
    if (!begun) {
      begin(total);
      begun = true;
    }
    std::for_each(links.begin(), links.end(), take);
    if (total - request.offset <= request.limit) {
      break;
    }
    request.offset += request.limit;
  }
}

void ListAsJson(const ListOptionValues& options, std::time_t now) {
  const char* separator = "";
  ForEachLink(
      options, now,
      [&options](int total) {
        std::cout << R"({"total":)" << total << R"(,"offset":)" << options.offset
                  << R"(,"links":[)";
      },
      [&separator, now](const Entry& link) {
        std::cout << separator << JsonLine(owner::LinkJson(link, now));
        separator = ",";
      });
  std::cout << "]}\n";
}

void ListAsTable(const ListOptionValues& options, std::time_t now) {
  Table table = LinkTable();
  ForEachLink(
      options, now, [](int /*total*/) {},
      [&table, now](const Entry& link) { table.Add(CellsOf(link, now)); });
  table.Print(std::cout, TerminalWidth(STDOUT_FILENO));
}

}  // namespace

ExitStatus List(const ListOptionValues& options) {
  const std::time_t now = std::time(nullptr);
  if (options.json) {
    ListAsJson(options, now);
  } else {
    ListAsTable(options, now);
  }
  return ExitStatus::kDone;
}

}  // namespace cli
