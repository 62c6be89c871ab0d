// A program in C that stands on the C interface alone: it makes a raster by a job, writes it, reads
// it in another order and through a view, and has each function refuse what it can't do in one
// line.
#include <c/vexg.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

enum { kSamples = 7, kLines = 5, kBands = 3, kValues = kSamples * kLines * kBands };

static void expect(int holds, const char* what, char* fault) {
  if (holds) return;
  printf("%s: %s\n", what, fault != NULL ? fault : "");
  exit(1);
}

// A call fails, and says why in one line.
#define EXPECT_FAULT(call, what, words)                                              \
  do {                                                                               \
    const int given = (call) != 0;                                                   \
    const int tells = fault != NULL && strstr(fault, words) && !strchr(fault, '\n'); \
    expect(!given && tells, what, fault);                                            \
    vexg_free(fault);                                                                \
  } while (0)

static uint16_t value_at(int sample, int line, int band) {
  return (uint16_t)(10000 * band + 100 * line + sample);
}

// The text between two others, for the URI in a result document.
static void cut(const char* text, const char* from, const char* to, char* out, size_t size) {
  const char* begin = strstr(text, from);
  const char* end = begin != NULL ? strstr(begin + strlen(from), to) : NULL;
  expect(end != NULL && (size_t)(end - begin) < size, "the result has no URI", (char*)text);
  begin += strlen(from);
  memcpy(out, begin, (size_t)(end - begin));
  out[end - begin] = 0;
}

static void run_to_success(const char* document) {
  char *fault = NULL, *result = vexg_run(document, NULL, NULL, &fault);
  expect(result != NULL && strstr(result, "Result=\"Success\"") != NULL, document,
         result ? result : fault);
  vexg_free(result);
}

int main(void) {
  char* fault = NULL;
  expect(vexg_abi() == VEXG_ABI, "another interface", NULL);
  expect(vexg_init(&fault), "vexg_init", fault);
  expect(strchr(vexg_version(), '.') != NULL, "vexg_version", NULL);

  // A raster in memory, which is open until it is closed.
  double progress = 0;
  uint8_t abort_flag = 0;
  char* result = vexg_run(
      "<Job><Command Name=\"make\" ID=\"CreateMemoryRasterCommand\"><Input Samples=\"7\" "
      "Lines=\"5\" Bands=\"3\" "
      "DataType=\"UInt16\" Interleave=\"BIL\"/></Command></Job>",
      &abort_flag, &progress, &fault);
  expect(result != NULL, "vexg_run", fault);
  expect(progress == 1, "the progress of a job that has ended", result);
  char uri[200];
  cut(result, "URI=\"", "\"", uri, sizeof uri);
  vexg_free(result);

  uint16_t pixels[kValues], read[kValues];
  uint8_t states[kValues];
  const uint32_t bands[kBands] = {0, 1, 2};
  int at = 0;
  for (int line = 0; line < kLines; ++line)
    for (int sample = 0; sample < kSamples; ++sample)
      for (int band = 0; band < kBands; ++band) pixels[at++] = value_at(sample, line, band);
  struct vexg_block block = {{0, 0, kSamples - 1, kLines - 1},
                             bands,
                             kBands,
                             VEXG_BIP,
                             12,
                             0,
                             pixels,
                             sizeof pixels,
                             NULL};
  expect(vexg_write(uri, &block, NULL, &fault), "vexg_write", fault);

  // Another order, some of the bands, a part.
  const uint32_t turned[2] = {2, 0};
  struct vexg_block part = {{2, 1, 5, 3}, turned, 2, VEXG_BSQ, 12, 0, read, sizeof read, states};
  expect(vexg_read(uri, &part, &abort_flag, &fault), "vexg_read", fault);
  at = 0;
  for (int band = 0; band < 2; ++band)
    for (int line = 1; line <= 3; ++line)
      for (int sample = 2; sample <= 5; ++sample, ++at)
        expect(read[at] == value_at(sample, line, (int)turned[band]) && states[at] == 0, "a pixel",
               NULL);

  // A job that stands a view on a source, which has no file of its own.
  const char* view =
      "<Job><Command Name=\"open\" ID=\"OpenRasterCommand\"><Input ConnStr=\"plane:5x4\"/><Output "
      "URI=\"$a\"/></Command>"
      "<Command Name=\"part\" ID=\"CreateSpatialSubsetRasterCommand\"><DependsOn Name=\"open\"/>"
      "<Input SrcURI=\"$a\" SubRect=\"1 1 3 2\"/><Output URI=\"$b\"/></Command></Job>";
  for (int turn = 0; turn < 2; ++turn) {
    char* told = vexg_describe(view, &fault);
    expect(told != NULL && strstr(told, "\"samples\":3,\"lines\":2,") != NULL, "vexg_describe",
           told ? told : fault);
    vexg_free(told);
    expect(vexg_close(view, &fault), "vexg_close", fault);
  }
  char* commands = vexg_commands(&fault);
  expect(commands != NULL && strstr(commands, "\"OpenRasterCommand\"") != NULL, "vexg_commands",
         fault);
  vexg_free(commands);
  expect(vexg_thread_limit(1, &fault) == 1 && vexg_thread_limit(0, &fault) >= 1,
         "vexg_thread_limit", fault);

  // Refusals.
  struct vexg_block wrong = part;
  wrong.rect.right = kSamples;
  EXPECT_FAULT(vexg_read(uri, &wrong, NULL, &fault), "a rectangle outside", "not inside");
  wrong = part;
  wrong.data_type = 4;
  EXPECT_FAULT(vexg_read(uri, &wrong, NULL, &fault), "another type", "of type UInt16");
  wrong = part;
  wrong.size = 47;
  EXPECT_FAULT(vexg_read(uri, &wrong, NULL, &fault), "memory too small", "too small");
  wrong = part;
  wrong.order = 3;
  EXPECT_FAULT(vexg_read(uri, &wrong, NULL, &fault), "no order", "order");
  abort_flag = 1;
  EXPECT_FAULT(vexg_read(uri, &part, &abort_flag, &fault), "an abort", "aborted");
  EXPECT_FAULT(vexg_read("no/such/file.tif", &part, NULL, &fault), "no file", "no/such/file.tif");
  EXPECT_FAULT(vexg_read(NULL, &part, NULL, &fault), "no name", "no raster");
  expect(!vexg_write(view, &part, NULL, NULL), "no place for a fault", NULL);
  EXPECT_FAULT(vexg_describe("<Job><Command ID=\"CreateRasterCommand\"/></Job>", &fault),
               "a job that makes files", "only opens");
  EXPECT_FAULT(vexg_describe("[no such object] ", &fault), "no object", "no open raster");
  EXPECT_FAULT(vexg_run(NULL, NULL, NULL, &fault), "no document", "no document");

  char closing[300];
  snprintf(closing, sizeof closing,
           "<Job><Command ID=\"CloseRasterCommand\"><Input URI=\"%s\"/></Command></Job>", uri);
  run_to_success(closing);
  EXPECT_FAULT(vexg_read(uri, &part, NULL, &fault), "a closed raster", "no open raster");
  expect(vexg_close(NULL, &fault), "closing all", fault);
  vexg_free(NULL);
  puts("Success");
  return 0;
}
