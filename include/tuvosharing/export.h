// Marks what the library exports; everything else in it is hidden.
#ifndef TUVOSHARING_EXPORT_H_
#define TUVOSHARING_EXPORT_H_

// Stands before each declaration that programs may use.
#define TUVOSHARING_API __attribute__((visibility("default")))

#endif  // TUVOSHARING_EXPORT_H_
