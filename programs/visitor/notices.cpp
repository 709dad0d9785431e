#include "visitor/notices.h"

namespace visitor {

namespace {

constexpr NoticeText kNotFound = {
    404, "This link does not open",
    "There is no such link, or it is not open: it may have ended, be switched off, or not have "
    "begun yet. Check the address for a missing piece, or ask the person who sent it to you."};
constexpr NoticeText kUsedUp = {
    410, "This link is used up",
    "It has been opened as many times as its owner allowed. Ask the person who sent it to you for "
    "a new one."};
constexpr NoticeText kBlocked = {
    429, "Too many failed attempts",
    "Too many wrong passwords came from your network address, and it is locked out for a while. "
    "Wait half an hour, then try again. If you do not know the password, ask the person who sent "
    "you the link."};
constexpr NoticeText kFailure = {
    500, "Something went wrong here",
    "The link could not be opened because of a fault on this server. Try again in a minute; if it "
    "goes on, tell the person who sent you the link."};
constexpr NoticeText kBadRequest = {
    400, "This request cannot be read",
    "Your browser sent something that this page does not understand. Open the link again from "
    "where you got it."};
constexpr NoticeText kMethod = {405, "This is not how a link is opened",
                                "Open the link in a web browser."};
constexpr NoticeText kFromElsewhere = {
    403, "This came from another web site",
    "For your safety a link opens from its own page only. Open the link again from where you got "
    "it."};
constexpr NoticeText kRange = {416, "No such part of the file",
                               "The file is shorter than what was asked for. Download it again "
                               "from the beginning."};
constexpr NoticeText kPrecondition = {412, "The file has changed",
                                      "It is not the version that was asked for. Download it again "
                                      "from the beginning."};
constexpr NoticeText kFileGone = {
    404, "The file is no longer there",
    "The link is right, but what it shares was moved or removed. Tell the person who sent you the "
    "link."};
constexpr NoticeText kFileNotReadable = {
    500, "The file cannot be sent",
    "The link is right, but this server may not read what it shares. Tell the person who sent you "
    "the link."};
constexpr NoticeText kMisconfigured = {
    500, "This link is set up wrongly",
    "It does not lead anywhere. Tell the person who sent it to you."};
constexpr NoticeText kOtherApplication = {
    200, "The link is open",
    "You are admitted. What it shares belongs to another application on this server, which shows "
    "it to you."};
constexpr NoticeText kLoggedOut = {200, "You are logged out",
                                   "This browser no longer opens the link. Other links that you "
                                   "opened stay open."};
constexpr NoticeText kLogoutFailed = {
    500, "You could not be logged out",
    "This browser can still open the link, because of a fault on this server. Try again in a "
    "minute."};

}  // namespace

const NoticeText& TextOf(Notice notice) {
  switch (notice) {
    case Notice::kNotFound:
      return kNotFound;
    case Notice::kUsedUp:
      return kUsedUp;
    case Notice::kBlocked:
      return kBlocked;
    case Notice::kBadRequest:
      return kBadRequest;
    case Notice::kMethod:
      return kMethod;
    case Notice::kFromElsewhere:
      return kFromElsewhere;
    case Notice::kRange:
      return kRange;
    case Notice::kPrecondition:
      return kPrecondition;
    case Notice::kFileGone:
      return kFileGone;
    case Notice::kFileNotReadable:
      return kFileNotReadable;
    case Notice::kMisconfigured:
      return kMisconfigured;
    case Notice::kOtherApplication:
      return kOtherApplication;
    case Notice::kLoggedOut:
      return kLoggedOut;
    case Notice::kLogoutFailed:
      return kLogoutFailed;
    case Notice::kFailure:
      break;
  }
  return kFailure;
}

}  // namespace visitor
