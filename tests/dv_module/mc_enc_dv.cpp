// Stands in for the DV encoder module: counts how often it is closed.
#define EXPORTED extern "C" __attribute__((visibility("default")))

EXPORTED int gTimesClosed;
int gTimesClosed = 0;
EXPORTED void* DVNewEnc() { return nullptr; }
EXPORTED void DVDoneEnc(void* encoder) {
  if (!encoder) ++gTimesClosed;
}
EXPORTED int DVCompressBuffer() { return 0; }
