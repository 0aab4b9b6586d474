/*
 * Quillmere Search converter components.
 *
 * A converter component is a shared library that turns a document into named
 * text fields. The converters folder of the data directory names it in two
 * files:
 *
 *   Converters.txt   .msg=[COM_CONVERTER], Example.MailConverter
 *   Components.txt   Example.MailConverter=libexample_converter.so
 *
 * Components.txt maps a component identifier (compared without regard to
 * letter case) to the library's path; a relative path is taken from the
 * converters folder, and folder placeholders such as
 * "[QUILLMERE_DATA_CONVERTERS]\" are expanded.
 *
 * For each document the engine creates one object and calls, in this order:
 *
 *   CustomInitialize(object, data folder, converters folder, group name)
 *   OpenDocument(object, document path)
 *   GetFieldText(object, field name)      once per field the caller asks for
 *   CloseDocument(object)
 *   CustomTerminate(object)
 *
 * then releases the object. After every one of these calls it asks
 * GetErrorStatus; when that is non-zero it takes GetErrorMessage and fails the
 * conversion with that text. OpenDocument returning non-zero fails the
 * conversion as well ("Error opening document").
 *
 * Field names are upper-case; "DEFAULT_PLAIN_TEXT" is the text to index,
 * "DEFAULT_TITLE" and "DEFAULT_SUMMARY" are the document's title and summary.
 * An empty or null answer leaves the field as it was.
 *
 * Rules for implementers:
 *  - All text is UTF-8 and zero-terminated.
 *  - Texts returned by GetFieldText and GetErrorMessage stay owned by the
 *    object and must stay valid until the next call on the same object.
 *  - No C++ exception may leave an entry point.
 *  - Objects are used by one thread at a time; distinct objects may be used by
 *    distinct threads at once.
 *  - Export exactly these names with C linkage; ConverterInterfaceVersion must
 *    return QM_CONVERTER_INTERFACE_VERSION of the header the library was built
 *    with, or the engine refuses the library.
 */
#ifndef QUILLMERE_CONVERTER_PLUGIN_H
#define QUILLMERE_CONVERTER_PLUGIN_H

#ifdef __cplusplus
extern "C" {
#endif

#define QM_CONVERTER_INTERFACE_VERSION 1

#if defined(__GNUC__)
#define QM_CONVERTER_EXPORT __attribute__((visibility("default")))
#else
#define QM_CONVERTER_EXPORT
#endif

/* One converter object, defined by the component. */
typedef struct QmConverterObject QmConverterObject;

QM_CONVERTER_EXPORT int ConverterInterfaceVersion(void);
/* Returns null when no object can be made. */
QM_CONVERTER_EXPORT QmConverterObject* CreateConverterObject(void);
QM_CONVERTER_EXPORT void ReleaseConverterObject(QmConverterObject* object);

QM_CONVERTER_EXPORT void CustomInitialize(QmConverterObject* object, const char* data_folder,
                                          const char* converters_folder, const char* group);
/* Returns 0 when the document was opened. */
QM_CONVERTER_EXPORT int OpenDocument(QmConverterObject* object, const char* document_path);
QM_CONVERTER_EXPORT const char* GetFieldText(QmConverterObject* object, const char* field_name);
QM_CONVERTER_EXPORT void CloseDocument(QmConverterObject* object);
QM_CONVERTER_EXPORT void CustomTerminate(QmConverterObject* object);
QM_CONVERTER_EXPORT int GetErrorStatus(QmConverterObject* object);
QM_CONVERTER_EXPORT const char* GetErrorMessage(QmConverterObject* object);

/* The same entry points as pointer types, for loaders. */
typedef int (*QmConverterInterfaceVersionFn)(void);
typedef QmConverterObject* (*QmCreateConverterObjectFn)(void);
typedef void (*QmReleaseConverterObjectFn)(QmConverterObject*);
typedef void (*QmCustomInitializeFn)(QmConverterObject*, const char*, const char*, const char*);
typedef int (*QmOpenDocumentFn)(QmConverterObject*, const char*);
typedef const char* (*QmGetFieldTextFn)(QmConverterObject*, const char*);
typedef void (*QmCloseDocumentFn)(QmConverterObject*);
typedef void (*QmCustomTerminateFn)(QmConverterObject*);
typedef int (*QmGetErrorStatusFn)(QmConverterObject*);
typedef const char* (*QmGetErrorMessageFn)(QmConverterObject*);

#ifdef __cplusplus
}
#endif

#endif /* QUILLMERE_CONVERTER_PLUGIN_H */
