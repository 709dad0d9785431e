// Marks what the platform library exports; everything else in it is hidden.
#ifndef TUVOPLATFORM_EXPORT_H_
#define TUVOPLATFORM_EXPORT_H_

// Stands before each declaration that programs may use.
#define TUVOPLATFORM_API __attribute__((visibility("default")))

#endif  // TUVOPLATFORM_EXPORT_H_
