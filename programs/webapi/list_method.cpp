#include <tuvosharing/keys.h>

#include <algorithm>

#include "owner/link_json.h"
#include "owner/link_list.h"
#include "owner/link_state.h"
#include "owner/moment.h"
#include "owner/settings.h"
#include "webapi/database.h"
#include "webapi/link_api.h"
#include "webapi/ownership.h"

namespace webapi {

namespace {

using owner::Error;
using owner::Fault;
using owner::ListRequest;
using owner::MaybeProblem;

constexpr int kLargestPage = 500;
constexpr size_t kLongestSearch = 64;

// Of the links in an answer, as text. Any number of owners may ask at a time.
constexpr size_t kLargestList = size_t{16} << 20;

MaybeProblem ReadPage(const Json::Value& arguments, ListRequest* request) {
  request->offset = arguments.get("offset", request->offset).asInt();
  request->limit = arguments.get("limit", request->limit).asInt();
  if (request->offset < 0) {
    return Fault(Error::kBadValue, "must be at least 0", "offset");
  }
  if (request->limit < 1 || request->limit > kLargestPage) {
    return Fault(Error::kBadValue, "must be 1 to " + std::to_string(kLargestPage), "limit");
  }
  return std::nullopt;
}

MaybeProblem ReadOrder(const Json::Value& arguments, ListRequest* request) {
  request->sort = arguments.get("sort", request->sort).asString();
  request->descending = arguments.get("descending", request->descending).asBool();
  const std::vector<std::string>& columns = owner::SortColumns();
  return std::find(columns.begin(), columns.end(), request->sort) != columns.end()
             ? std::nullopt
             : Fault(Error::kBadValue, "is nothing to sort by", "sort");
}

// Two of the filters are read as the settings of their names.
MaybeProblem ReadOwnerAndProject(const Turn& turn, ListRequest* request) {
  if (MaybeProblem problem = CheckOwner(turn.account, turn.arguments)) {
    return problem;
  }
  owner::Settings settings;
  if (MaybeProblem problem = owner::ReadSettings(turn.arguments, turn.now, &settings)) {
    return problem;
  }
  request->owner_uid = settings.owner_uid;
  if (!turn.account.administrator) {
    request->owner_uid = turn.account.uid;
  }
  request->project_name = settings.project_name.value_or("");
  return std::nullopt;
}

MaybeProblem ReadFilters(const Turn& turn, ListRequest* request) {
  if (MaybeProblem problem = ReadOwnerAndProject(turn, request)) {
    return problem;
  }
  if (turn.arguments.isMember("state")) {
    request->state = owner::StateOfText(turn.arguments["state"].asString());
    if (!request->state) {
      return Fault(Error::kBadValue, "must be disabled, expired, used_up, not_yet or live",
                   "state");
    }
  }
  request->search = turn.arguments.get("search", "").asString();
  return request->search.size() <= kLongestSearch
             ? std::nullopt
             : Fault(Error::kBadValue,
                     "must have at most " + std::to_string(kLongestSearch) + " bytes", "search");
}

MaybeProblem ReadRequest(const Turn& turn, ListRequest* request) {
  if (MaybeProblem problem = ReadPage(turn.arguments, request)) {
    return problem;
  }
  if (MaybeProblem problem = ReadOrder(turn.arguments, request)) {
    return problem;
  }
  return ReadFilters(turn, request);
}

// Links as they come, as the text of a list.
class ListText {
 public:
  explicit ListText(std::string* text) : text_(text) { *text_ = "["; }

  // False when the list has no room for the link. A single one always has.
  bool Add(const std::string& link) {
    const bool is_first = text_->size() == 1;
    full_ = !is_first && text_->size() + link.size() > kLargestList;
    if (!full_) {
      text_->append(is_first ? "" : ",").append(link);
    }
    return !full_;
  }
  // False when a link had no room.
  bool Close() {
    text_->append("]");
    return !full_;
  }

 private:
  std::string* text_;
  bool full_ = false;
};

}  // namespace

MaybeProblem ListMethod(Turn* turn) {
  ListRequest request;
  if (MaybeProblem problem = ReadRequest(*turn, &request)) {
    return problem;
  }
  TUVO::sharing::db::BaseDB* db = nullptr;
  if (MaybeProblem problem = OpenDatabase(&db)) {
    return problem;
  }
  ListText list(&turn->links);
  const auto take = [&list, now = turn->now](const TUVO::sharing::record::Entry& link) {
    return list.Add(owner::WriteJson(owner::LinkJson(link, now)));
  };
  int total = 0;
  if (MaybeProblem problem = owner::ForEachLink(*db, request, turn->now, take, &total)) {
    return problem;
  }
  if (!list.Close()) {
    return Fault(Error::kBadValue,
                 "asks for links with more data than an answer holds; ask for fewer", "limit");
  }
  turn->data["total"] = total;
  turn->data["offset"] = request.offset;
  turn->data["now"] = owner::MomentText(turn->now);
  return std::nullopt;
}

}  // namespace webapi
