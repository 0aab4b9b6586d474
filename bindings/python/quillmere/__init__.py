"""Quillmere Search from Python: the command object (APICommand) builds and
drops findexes and orders, the search object (APISearch) runs search
statements and pages, orders and groups their results.

    import quillmere
    with quillmere.APISearch() as search:
        search.SetDataPath("/srv/quillmere")
        search.Execute("SELECT id FROM books WHERE [Books='river']")
        print(search.GetTotal(), search.GetRawKeyString(0, 10))

Methods carry the interfaces' names and parameters; a method's out value is
its return value. A failing method raises quillmere.Error. Booleans: True is
passed as -1, an int as given (ExecuteEx adds or blocks only for -1).

The library is libquillmere.so.6: the file QUILLMERE_LIBRARY names, else the
one installed with this package, else wherever the dynamic loader finds it.
"""

import ctypes

from ._dispatch import DispatchObject, Error, library

# Shown as quillmere.Error in tracebacks.
Error.__module__ = __name__

__all__ = ["APICommand", "APISearch", "Error", "create", "object_count", "version"]


class APICommand(DispatchObject):
    """The command object, QuillmereAPI.APICommand.1."""

    _prog_id = "QuillmereAPI.APICommand.1"


class APISearch(DispatchObject):
    """The search object, QuillmereAPI.APISearch.1."""

    _prog_id = "QuillmereAPI.APISearch.1"


_CLASSES = {cls._prog_id: cls for cls in (APICommand, APISearch)}


def create(prog_id):
    """An object by ProgID, versioned or not ("QuillmereAPI.APISearch")."""
    lib = library()
    handle = ctypes.c_void_p()
    hr = lib.qm_create(prog_id.encode("utf-8"), ctypes.byref(handle))
    if hr < 0:
        raise Error(lib.qm_error_description().decode("utf-8", "replace"),
                    lib.qm_error_source().decode("utf-8", "replace"), hr)
    cls = _CLASSES[lib.qm_prog_id(handle).decode("utf-8")]
    made = cls.__new__(cls)
    made._handle = handle
    cls._bind_methods(handle)
    return made


def object_count():
    """Objects of the library alive in this process (and server locks)."""
    return library().qm_object_count()


def version():
    """The library's version text, "6.14"."""
    return library().qm_version().decode("utf-8")
