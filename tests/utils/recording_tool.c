/* Stands in for one of the platform's tools: records how it was started, in /tmp/tool-arguments
 * (every argument followed by a NUL byte), and prints what /tmp/tool-output holds. */
#include <stdio.h>
#include <string.h>

int main(int count, char** arguments) {
  FILE* record = fopen("/tmp/tool-arguments", "wb");
  FILE* output = fopen("/tmp/tool-output", "rb");
  char chunk[4096];
  size_t length = 0;
  if (record == NULL || output == NULL) {
    return 1;
  }
  for (int i = 0; i < count; ++i) {
    fwrite(arguments[i], 1, strlen(arguments[i]) + 1, record);
  }
  fclose(record);
  while ((length = fread(chunk, 1, sizeof chunk, output)) != 0) {
    if (fwrite(chunk, 1, length, stdout) != length) {
      return 1;
    }
  }
  fclose(output);
  return 0;
}
