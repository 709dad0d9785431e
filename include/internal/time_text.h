// Times of links as local-time texts; 0 is "not set".
#ifndef INTERNAL_TIME_TEXT_H_
#define INTERNAL_TIME_TEXT_H_

#include <ctime>
#include <string>

namespace TUVO::sharing {

// `time` in local time under a strftime format. Empty for 0, for a null format, and when the text
// would be longer than 127 bytes.
std::string TimeToText(std::time_t time, const char* format);

// The time that `text` gives in local time under a strptime format; whether daylight saving applies
// is taken from the present moment, not from the text. 0 when the text is empty or does not fit.
std::time_t TextToTime(const std::string& text, const char* format);

}  // namespace TUVO::sharing

#endif  // INTERNAL_TIME_TEXT_H_
