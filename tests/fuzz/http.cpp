// What the programs read of, and write into, headers, addresses and pages.
//
// Input: which piece (the order of kPieces), then its arguments, a line each.
#include <algorithm>
#include <array>
#include <cstdlib>
#include <optional>
#include <string>
#include <string_view>

#include "client_address.h"
#include "common/hash_text.h"
#include "common/redirect_target.h"
#include "lines.h"
#include "owner/text_check.h"
#include "sharingurl/address.h"
#include "target.h"
#include "visitor/byte_range.h"
#include "visitor/content_disposition.h"
#include "visitor/html.h"
#include "visitor/preconditions.h"
#include "visitor/route.h"
#include "webapi/same_origin.h"

namespace {

using fuzz::Require;
using fuzz::RequireEqual;

bool IsVisible(std::string_view text) {
  return std::all_of(text.begin(), text.end(), [](char c) { return c >= ' ' && c < '\x7f'; });
}

std::string Lower(std::string text) {
  for (char& c : text) {
    c = c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
  }
  return text;
}

bool StartsWith(std::string_view text, std::string_view start) {
  return text.substr(0, start.size()) == start;
}

// A short run of digits alone, as a number.
std::optional<std::int64_t> Digits(const std::string& text) {
  if (text.empty() || text.size() > 15 ||
      text.find_first_not_of("0123456789") != std::string::npos) {
    return std::nullopt;
  }
  return std::strtoll(text.c_str(), nullptr, 10);
}

void Range(fuzz::Lines* lines) {
  const std::int64_t size = lines->Number() & std::int64_t{0x7fffffffffffffff};
  const std::string header = lines->Text();
  const visitor::RangeRequest range = visitor::ParseRange(header, size);
  if (range.kind == visitor::RangeRequest::kPart) {
    Require(range.offset >= 0 && range.length >= 1 && range.offset <= size - range.length,
            "a part lies within the file");
  } else {
    Require(range.offset == 0 && range.length == 0, "what is no part has no place");
  }
  const std::size_t dash = header.find('-');
  if (!StartsWith(header, "bytes=") || dash == std::string::npos) {
    return;
  }
  const auto first = Digits(header.substr(6, dash - 6));
  const auto last = Digits(header.substr(dash + 1));
  if (first && last && *first <= *last) {
    const bool is_there = *first < size;
    Require(range.kind ==
                (is_there ? visitor::RangeRequest::kPart : visitor::RangeRequest::kUnsatisfiable),
            "a range is understood");
    Require(!is_there ||
                (range.offset == *first && range.length == std::min(*last, size - 1) - *first + 1),
            "a range is the one that was asked for");
  }
}

// Undoes percent signs; ends the process for one that does not begin an escape.
std::string Decoded(std::string_view text) {
  std::string decoded;
  for (std::size_t i = 0; i < text.size(); ++i) {
    if (text[i] != '%') {
      decoded.push_back(text[i]);
      continue;
    }
    const std::string digits(text.substr(i + 1, 2));
    Require(digits.size() == 2 && digits.find_first_not_of("0123456789ABCDEF") == std::string::npos,
            "a percent sign begins an escape");
    decoded.push_back(static_cast<char>(std::strtol(digits.c_str(), nullptr, 16)));
    i += 2;
  }
  return decoded;
}

void Disposition(fuzz::Lines* lines) {
  constexpr std::string_view kStart = "attachment; filename=\"";
  constexpr std::string_view kMiddle = "\"; filename*=UTF-8''";
  const std::string name = lines->Text();
  const std::string value = visitor::AttachmentNamed(name);
  Require(IsVisible(value) && StartsWith(value, kStart), "the value stays one value");
  const std::size_t quote = value.find('"', kStart.size());
  RequireEqual(std::string(value.substr(quote, kMiddle.size())), std::string(kMiddle),
               "the name does not end its quotes");
  Require(value.find('\\') == std::string::npos, "no backslashes");
  const std::string_view encoded = std::string_view(value).substr(quote + kMiddle.size());
  Require(encoded.find_first_of("\"; ,'()<>@:/[]?={}") == std::string_view::npos,
          "the encoded name holds nothing that ends it");
  const std::string decoded = Decoded(encoded);
  Require(owner::IsUtf8(decoded), "the encoded name is UTF-8");
  RequireEqual(decoded, owner::RepairedUtf8(name), "the encoded name is the file's");
}

void Redirect(fuzz::Lines* lines) {
  const std::string uri = lines->Text();
  const std::optional<std::string> target = common::RedirectTarget(uri);
  if (!target) {
    return;
  }
  Require(IsVisible(*target) && target->find_first_of(" \"<>\\^`{|}") == std::string::npos,
          "a target is one address");
  Require(!StartsWith(*target, "//") && !target->empty(), "a target does not name a host unseen");
  const std::size_t mark = target->find_first_of(":/?#");
  if (mark != std::string::npos && (*target)[mark] == ':') {
    const std::string scheme = Lower(target->substr(0, mark));
    Require(scheme == "http" || scheme == "https", "no other schemes");
    Require(common::NamesHost(*target), "an address with a scheme names its host");
  }
  RequireEqual(common::RedirectTarget(*target).value_or("refused"), *target,
               "a target is a target again");
}

void Preconditions(fuzz::Lines* lines) {
  visitor::ConditionHeaders headers;
  headers.if_match = lines->Text();
  headers.if_unmodified_since = lines->Text();
  headers.if_none_match = lines->Text();
  headers.if_modified_since = lines->Text();
  headers.if_range = lines->Text();
  visitor::Validators validators;
  validators.etag = "\"1-2-3\"";
  validators.modified = static_cast<std::time_t>(lines->Number());
  const visitor::Verdict verdict = visitor::Evaluate(headers, validators);
  Require(verdict != visitor::Verdict::kFailed || !headers.if_match.empty() ||
              !headers.if_unmodified_since.empty(),
          "only a condition fails");
  Require(verdict != visitor::Verdict::kNotModified || !headers.if_none_match.empty() ||
              !headers.if_modified_since.empty(),
          "only who asks is told that nothing has changed");
  const bool tag_in_match = headers.if_match.find(validators.etag) != std::string::npos;
  Require(headers.if_match.empty() || headers.if_match.find('*') != std::string::npos ||
              tag_in_match || verdict == visitor::Verdict::kFailed,
          "another version fails If-Match");
  const std::time_t now = validators.modified > 5 ? validators.modified : 5;
  (void)visitor::RangeApplies(headers.if_range, validators, now);
}

void Html(fuzz::Lines* lines) {
  const std::string text = lines->Text();
  std::string escaped = visitor::HtmlEscape(text);
  Require(escaped.find_first_of("<>\"'") == std::string::npos, "nothing begins or ends in a page");
  std::string plain;
  constexpr std::array<std::pair<std::string_view, char>, 6> kReferences = {{{"&amp;", '&'},
                                                                             {"&lt;", '<'},
                                                                             {"&gt;", '>'},
                                                                             {"&quot;", '"'},
                                                                             {"&#39;", '\''},
                                                                             {"&#x27;", '\''}}};
  for (std::size_t at = 0; at < escaped.size();) {
    const auto* found =
        std::find_if(kReferences.begin(), kReferences.end(), [&](const auto& reference) {
          return escaped.compare(at, reference.first.size(), reference.first) == 0;
        });
    Require(found != kReferences.end() || escaped[at] != '&', "an ampersand begins a reference");
    plain += found != kReferences.end() ? found->second : escaped[at];
    at += found != kReferences.end() ? found->first.size() : 1;
  }
  Require(plain.size() == text.size(), "a text keeps its length");
  for (std::size_t i = 0; i < text.size(); ++i) {
    const auto byte = static_cast<unsigned char>(text[i]);
    Require(plain[i] == text[i] || ((byte < ' ' || byte == 0x7f) && plain[i] == ' '),
            "a text is shown as it is");
  }
}

void Route(fuzz::Lines* lines) {
  const std::string path = lines->Text();
  const visitor::Route route = visitor::ParseRoute(path);
  if (route.place == visitor::Place::kNowhere) {
    Require(route.hash.empty(), "nowhere has no hash");
    return;
  }
  Require(common::IsHashText(route.hash), "a link has a hash");
  const bool logs_out = route.place == visitor::Place::kLogout;
  const std::string whole =
      logs_out ? visitor::LogoutPath(route.hash) : visitor::LinkPath(route.hash);
  RequireEqual(whole, std::string(visitor::kMountPath) + path,
               "a path is a link's in one way alone");
}

// "host:80" is "host" where 80 is the scheme's own.
std::string WithoutOwnPort(std::string place, bool https) {
  const std::string port = https ? ":443" : ":80";
  if (place.size() > port.size() && place.substr(place.size() - port.size()) == port) {
    place.erase(place.size() - port.size());
  }
  return place;
}

void Origin(fuzz::Lines* lines) {
  webapi::OriginHeaders headers;
  headers.https = lines->Flag();
  headers.host = lines->Text();
  headers.origin = lines->Text();
  const std::string site = lines->Text();
  if (!site.empty()) {
    headers.fetch_site = site;
  }
  if (webapi::IsSameOrigin(headers)) {
    Require(site.empty() || site == "same-origin" || site == "none", "no other site");
    const std::string own = std::string(headers.https ? "https://" : "http://") +
                            WithoutOwnPort(headers.host, headers.https);
    RequireEqual(Lower(WithoutOwnPort(*headers.origin, headers.https)), Lower(own),
                 "the page is this server's own");
  }
}

void Address(fuzz::Lines* lines) {
  const bool https = lines->Flag();
  const int port = static_cast<int>(lines->Choice(65536));
  const std::string text = lines->Text();
  const std::optional<sharingurl::Address> address = sharingurl::ReadAddress(text);
  if (!address) {
    return;
  }
  const std::string link = sharingurl::LinkAddress(*address, https, port, "abc");
  Require(IsVisible(link) && link.find_first_of(" \"'<>\\^`{|}?#@&") == std::string::npos,
          "an address stays one");
  constexpr std::string_view kEnd = "/sharing/abc";
  Require(link.size() > kEnd.size() && link.substr(link.size() - kEnd.size()) == kEnd,
          "an address ends with its hash");
  const std::string beginning = link.substr(0, link.size() - kEnd.size());
  const auto again = sharingurl::ReadAddress(beginning);
  Require(again.has_value(), "an address is an address");
  RequireEqual(sharingurl::LinkAddress(*again, https, port, "abc"), link, "it stays the same one");
}

void Client(fuzz::Lines* lines) {
  const std::string text = lines->Text();
  const std::optional<std::string> address = tuvo_platform::CanonicalAddress(text.c_str());
  const std::optional<std::string> network = tuvo_platform::VisitorNetwork(text.c_str());
  Require(address.has_value() == network.has_value(), "an address has a network");
  if (address) {
    Require(address->find_first_not_of("0123456789abcdef:.") == std::string::npos,
            "an address has no other characters");
    RequireEqual(tuvo_platform::CanonicalAddress(address->c_str()).value_or("none"), *address,
                 "one spelling");
    RequireEqual(tuvo_platform::VisitorNetwork(address->c_str()).value_or("none"), *network,
                 "one network");
  }
}

using Piece = void (*)(fuzz::Lines* lines);
constexpr std::array<Piece, 9> kPieces = {Range, Disposition, Redirect, Preconditions, Html,
                                          Route, Origin,      Address,  Client};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  fuzz::Lines lines(data, size);
  kPieces.at(lines.Choice(kPieces.size()))(&lines);
  return 0;
}
