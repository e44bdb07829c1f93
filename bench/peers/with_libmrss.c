/* Parses a feed with libmrss, into its records, and writes how many items it has.
   usage: with_libmrss FEED OUTPUT */
#include <mrss.h>
#include <stdio.h>

int main(int count, char** arguments) {
  if (count != 3) return 1;
  mrss_t* feed = NULL;
  const mrss_error_t error = mrss_parse_file(arguments[1], &feed);
  if (error != MRSS_OK) {
    fprintf(stderr, "%s\n", mrss_strerror(error));
    return 1;
  }
  int items = 0;
  for (const mrss_item_t* item = feed->item; item != NULL; item = item->next) ++items;
  FILE* output = fopen(arguments[2], "w");
  if (output == NULL || fprintf(output, "%d\n", items) < 0 || fclose(output) != 0) return 1;
  return 0;
}
