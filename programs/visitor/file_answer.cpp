#include "visitor/file_answer.h"

#include <string>

#include "visitor/byte_range.h"
#include "visitor/content_disposition.h"
#include "visitor/content_type.h"
#include "visitor/http_date.h"
#include "visitor/page_answers.h"

namespace visitor {

namespace {

constexpr int kPartialContent = 206;
constexpr int kNotModified = 304;

void AddValidators(Answer* answer, const Validators& validators) {
  AddHeader(answer, "ETag", validators.etag);
  const std::string modified = HttpDate(validators.modified);
  if (!modified.empty()) {
    AddHeader(answer, "Last-Modified", modified);
  }
}

// Whatever the file holds, it is to be stored and not shown; a browser that shows it all the same
// shows it as nothing but text and pictures without an origin.
void AddFileHeaders(Answer* answer, const SharedFile& file) {
  AddHeader(answer, "Content-Type", ContentTypeOf(file.name));
  AddHeader(answer, "Content-Disposition", AttachmentNamed(file.name));
  AddHeader(answer, "Content-Security-Policy", "default-src 'none'; sandbox");
  AddHeader(answer, "Accept-Ranges", "bytes");
}

// A Range header has a meaning for GET alone.
RangeRequest RangeOf(const Request& request, const SharedFile& file, std::time_t now) {
  if (request.method != Method::kGet ||
      !RangeApplies(request.conditions.if_range, file.validators, now)) {
    return ParseRange({}, file.size);
  }
  return ParseRange(request.range, file.size);
}

Answer NotModifiedAnswer(const Validators& validators) {
  Answer answer;
  answer.status = kNotModified;
  AddValidators(&answer, validators);
  return answer;
}

Answer UnsatisfiableAnswer(const SharedFile& file) {
  Answer answer = NoticeAnswer(Notice::kRange);
  AddHeader(&answer, "Content-Range", "bytes */" + std::to_string(file.size));
  return answer;
}

}  // namespace

Answer FileAnswer(const Request& request, SharedFile file, std::time_t now) {
  switch (Evaluate(request.conditions, file.validators)) {
    case Verdict::kFailed:
      return NoticeAnswer(Notice::kPrecondition);
    case Verdict::kNotModified:
      return NotModifiedAnswer(file.validators);
    case Verdict::kSend:
      break;
  }
  const RangeRequest range = RangeOf(request, file, now);
  if (range.kind == RangeRequest::kUnsatisfiable) {
    return UnsatisfiableAnswer(file);
  }
  Answer answer;
  AddFileHeaders(&answer, file);
  AddValidators(&answer, file.validators);
  std::int64_t length = file.size;
  if (range.kind == RangeRequest::kPart) {
    length = range.length;
    answer.status = kPartialContent;
    AddHeader(&answer, "Content-Range",
              "bytes " + std::to_string(range.offset) + "-" +
                  std::to_string(range.offset + length - 1) + "/" + std::to_string(file.size));
  }
  answer.file = FilePiece{std::move(file.fd), range.offset, length, file.link};
  return answer;
}

}  // namespace visitor
