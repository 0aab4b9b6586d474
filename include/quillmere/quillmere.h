/* The C interface of libquillmere: create the API objects by ProgID and call
 * their methods by dispatch identifier with arrays of variants, the way a
 * dispatch interface is called. Every method of APICommand (43) and
 * APISearch (44) is reachable; quillmere-api.json, installed beside the
 * library, describes them (names, dispatch identifiers, parameters, the
 * enumerations) and is the registration of this library.
 *
 * Result codes: QM_S_OK, or a failure code; every failure also leaves the
 * calling thread's error information (qm_error_description/qm_error_source).
 * No C++ exception leaves a function of this header.
 *
 * Texts: UTF-8 (QM_VT_UTF8) or UTF-16 (QM_VT_UTF16) in; results are UTF-8
 * texts the library allocates, freed by qm_variant_clear.
 *
 * Threads: an object is called from one thread at a time; error information
 * belongs to the thread that failed. */
#ifndef QUILLMERE_QUILLMERE_H
#define QUILLMERE_QUILLMERE_H

#include <stddef.h>
#include <stdint.h>

#if defined(__GNUC__)
#define QM_C_API __attribute__((visibility("default")))
#else
#define QM_C_API
#endif

#ifdef __cplusplus
extern "C" {
#endif

/* Result codes (the component model's values). */
#define QM_S_OK ((int32_t)0)
#define QM_S_FALSE ((int32_t)1)
#define QM_E_POINTER ((int32_t)0x80004003)
#define QM_E_INVALIDARG ((int32_t)0x80070057)
#define QM_E_OUTOFMEMORY ((int32_t)0x8007000E)
#define QM_DISP_E_MEMBERNOTFOUND ((int32_t)0x80020003)
#define QM_DISP_E_TYPEMISMATCH ((int32_t)0x80020005)
#define QM_DISP_E_UNKNOWNNAME ((int32_t)0x80020006)
#define QM_DISP_E_EXCEPTION ((int32_t)0x80020009)
#define QM_DISP_E_BADPARAMCOUNT ((int32_t)0x8002000E)
#define QM_REGDB_E_CLASSNOTREG ((int32_t)0x80040154)

/* The registration: class names, ProgIDs and the fixed identifiers. */
#define QM_PROGID_APISEARCH "QuillmereAPI.APISearch.1"
#define QM_PROGID_APISEARCH_INDEPENDENT "QuillmereAPI.APISearch"
#define QM_PROGID_APICOMMAND "QuillmereAPI.APICommand.1"
#define QM_PROGID_APICOMMAND_INDEPENDENT "QuillmereAPI.APICommand"
#define QM_FRIENDLY_NAME_APISEARCH "APISearch Object"
#define QM_FRIENDLY_NAME_APICOMMAND "APICommand Object"
#define QM_CLSID_APISEARCH "{4B8AEA0D-E11D-47DB-97A4-35DAEA958CD8}"
#define QM_CLSID_APICOMMAND "{A09BB32A-0971-49B0-9141-F6DCE366651E}"
#define QM_IID_IAPISEARCH "{DE708EB7-EF12-4692-914A-05452B1390DA}"
#define QM_IID_IAPICOMMAND "{729E10F6-071A-495F-8D59-832F22CDC1EE}"
#define QM_LIBID_QUILLMEREAPI "{398EC8C3-0482-452B-8185-62FB70A19E13}"
#define QM_APPID_QUILLMEREAPI "{69C68B02-B034-4A63-B1EE-E66BA6FE3348}"
#define QM_TYPELIB_NAME "QuillmereAPI"
#define QM_TYPELIB_HELP "Quillmere Search Core API v6.0"
#define QM_TYPELIB_VERSION "1.0"
#define QM_TYPELIB_LOCALE 1033
#define QM_THREADING_MODEL "apartment"

/* Variant types: the codes of the component model where one exists. */
enum {
  QM_VT_EMPTY = 0, /* no value; as a text argument, the null text */
  QM_VT_I4 = 3,    /* 32-bit integer */
  QM_VT_R8 = 5,    /* double */
  QM_VT_BOOL = 11, /* 16-bit boolean: -1 true, 0 false; other values pass as given */
  QM_VT_UTF8 = 1001,
  QM_VT_UTF16 = 1002
};

typedef struct qm_variant {
  int32_t type;  /* QM_VT_* */
  int32_t byref; /* non-zero: an out parameter the call fills (arguments only) */
  int32_t owned; /* set by the library on a text it allocated; qm_variant_clear frees it */
  union {
    int32_t i4;
    double r8;
    int16_t boolean;
    struct {
      const char* data; /* length 0: the text ends at its first zero */
      size_t length;
    } utf8;
    struct {
      const uint16_t* data;
      size_t length;
    } utf16;
  } value;
} qm_variant;

typedef struct qm_object qm_object;

/* Creates an object by ProgID, versioned or not ("QuillmereAPI.APISearch",
 * "QuillmereAPI.APISearch.1", ...); QM_REGDB_E_CLASSNOTREG for another name. */
QM_C_API int32_t qm_create(const char* prog_id, qm_object** object);
/* Reference counting: a new object has one reference; the last release
 * destroys it. qm_release(NULL) does nothing. */
QM_C_API int32_t qm_add_ref(qm_object* object);
QM_C_API int32_t qm_release(qm_object* object);
/* The class of an object: its versioned ProgID. */
QM_C_API const char* qm_prog_id(const qm_object* object);

/* A method name (compared without regard to case) to its dispatch identifier;
 * QM_DISP_E_UNKNOWNNAME when the interface has no such method. */
QM_C_API int32_t qm_get_dispid(const qm_object* object, const char* name, int32_t* dispid);
/* The method's name and number of parameters, its result included. */
QM_C_API int32_t qm_method_name(const qm_object* object, int32_t dispid, const char** name,
                                int32_t* parameter_count);
/* Parameter index (0-based) of the method: its name, type (QM_VT_I4, QM_VT_R8,
 * QM_VT_BOOL, or QM_VT_UTF16 for a text) and whether it is the method's
 * result (an out parameter). */
QM_C_API int32_t qm_method_parameter(const qm_object* object, int32_t dispid, int32_t index,
                                     const char** name, int32_t* type, int32_t* is_result);

/* Calls a method: args hold its in parameters in order; result (may be NULL)
 * receives the result of a method that has one, and so does a last by-ref
 * argument when one is passed for it. Both are overwritten: clear a text
 * they held from an earlier call first. Argument counts and types are checked
 * before the call: QM_DISP_E_BADPARAMCOUNT, QM_DISP_E_TYPEMISMATCH,
 * QM_DISP_E_MEMBERNOTFOUND for an unknown identifier. A failing method gives
 * QM_DISP_E_EXCEPTION. Integers convert to booleans keeping their low 16 bits
 * (1 stays 1: ExecuteEx adds only for -1), integers to doubles, and doubles
 * with no fraction to integers. */
QM_C_API int32_t qm_invoke(qm_object* object, int32_t dispid, qm_variant* args,
                           int32_t arg_count, qm_variant* result);

/* Frees what the library allocated for a result and empties it. */
QM_C_API void qm_variant_clear(qm_variant* variant);

/* The error information the calling thread's last call of this interface
 * (other than the error, version, count and reference calls) left, as UTF-8: set by every failure, and also by a method that refuses
 * while returning QM_S_OK. Empty texts when the call left none. Valid until
 * the thread's next call. */
QM_C_API const char* qm_error_description(void);
QM_C_API const char* qm_error_source(void);

/* The unload check: live objects plus server locks; qm_can_unload_now gives
 * QM_S_OK when both are 0, else QM_S_FALSE. */
QM_C_API int32_t qm_lock_server(int32_t lock);
QM_C_API int32_t qm_object_count(void);
QM_C_API int32_t qm_can_unload_now(void);

/* The library version text ("6.14"). */
QM_C_API const char* qm_version(void);

#ifdef __cplusplus
}
#endif

#endif /* QUILLMERE_QUILLMERE_H */
