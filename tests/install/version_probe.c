/* A C program that knows the library only through quillmere.h: creates a
 * search object by ProgID, calls GetVersion by dispatch identifier and prints
 * the result. Exits non-zero on any failure, naming it. */
#include <stdio.h>

#include <quillmere/quillmere.h>

static int Fail(const char* what, int32_t hr) {
  fprintf(stderr, "%s failed (0x%08X): %s\n", what, (unsigned)hr, qm_error_description());
  return 1;
}

int main(void) {
  qm_object* search = NULL;
  int32_t hr = qm_create(QM_PROGID_APISEARCH_INDEPENDENT, &search);
  if (hr != QM_S_OK) return Fail("qm_create", hr);
  int32_t dispid = 0;
  hr = qm_get_dispid(search, "getversion", &dispid);
  if (hr != QM_S_OK) return Fail("qm_get_dispid", hr);
  qm_variant result = {0};
  hr = qm_invoke(search, dispid, NULL, 0, &result);
  if (hr != QM_S_OK) return Fail("qm_invoke", hr);
  if (result.type != QM_VT_UTF8) {
    fprintf(stderr, "GetVersion gave a variant of type %d\n", (int)result.type);
    return 1;
  }
  printf("%s\n", result.value.utf8.data);
  qm_variant_clear(&result);
  qm_release(search);
  if (qm_can_unload_now() != QM_S_OK) {
    fprintf(stderr, "objects left after the release: %d\n", (int)qm_object_count());
    return 1;
  }
  return 0;
}
