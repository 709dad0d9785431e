// A second opinion on url-encoded texts, written from their definition alone.
#ifndef TESTS_FUZZ_FORM_DECODER_H_
#define TESTS_FUZZ_FORM_DECODER_H_

#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace fuzz {

using Field = std::pair<std::string, std::string>;

// Appends the fields of `text` to `*fields`; false when it may not be taken: a zero byte, or a per
// cent sign without two hexadecimal digits.
bool DecodeForm(std::string_view text, std::vector<Field>* fields);

}  // namespace fuzz

#endif  // TESTS_FUZZ_FORM_DECODER_H_
