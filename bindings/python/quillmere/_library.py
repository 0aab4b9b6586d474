"""Finding and loading libquillmere, and the C interface's types and prototypes."""

import ctypes
import os

SONAME = "libquillmere.so.6"

S_OK = 0
DISP_E_MEMBERNOTFOUND = -2147352573  # 0x80020003 as a signed 32-bit value

VT_EMPTY = 0
VT_I4 = 3
VT_R8 = 5
VT_BOOL = 11
VT_UTF8 = 1001
VT_UTF16 = 1002


class _Text(ctypes.Structure):
    _fields_ = [("data", ctypes.c_void_p), ("length", ctypes.c_size_t)]


class _Value(ctypes.Union):
    _fields_ = [
        ("i4", ctypes.c_int32),
        ("r8", ctypes.c_double),
        ("boolean", ctypes.c_int16),
        ("utf8", _Text),
        ("utf16", _Text),
    ]


class Variant(ctypes.Structure):
    _fields_ = [
        ("type", ctypes.c_int32),
        ("byref", ctypes.c_int32),
        ("owned", ctypes.c_int32),
        ("value", _Value),
    ]


def _candidates():
    """Where to look, in order: the environment, the install this package came
    with, then the dynamic loader's own search by soname."""
    explicit = os.environ.get("QUILLMERE_LIBRARY")
    if explicit:
        return [explicit], True
    found = []
    try:
        from . import _installed
    except ImportError:
        _installed = None
    if _installed is not None:
        here = os.path.dirname(os.path.abspath(__file__))
        found.append(os.path.normpath(os.path.join(here, _installed.LIBRARY_DIR, SONAME)))
    found.append(SONAME)
    return found, False


def load():
    """The loaded library with its prototypes set; OSError naming every place
    tried when none loads."""
    names, explicit = _candidates()
    failures = []
    for name in names:
        if os.sep in name and not os.path.exists(name):
            failures.append(f"{name}: no such file")
            continue
        try:
            library = ctypes.CDLL(name)
        except OSError as error:
            failures.append(str(error))
            continue
        _declare(library)
        return library
    hint = "" if explicit else " (set QUILLMERE_LIBRARY to the library's path)"
    raise OSError("cannot load libquillmere" + hint + ": " + "; ".join(failures))


def _declare(library):
    c_int32, c_char_p, c_void_p = ctypes.c_int32, ctypes.c_char_p, ctypes.c_void_p
    out_int = ctypes.POINTER(c_int32)
    out_text = ctypes.POINTER(c_char_p)
    prototypes = {
        "qm_create": (c_int32, [c_char_p, ctypes.POINTER(c_void_p)]),
        "qm_add_ref": (c_int32, [c_void_p]),
        "qm_release": (c_int32, [c_void_p]),
        "qm_prog_id": (c_char_p, [c_void_p]),
        "qm_get_dispid": (c_int32, [c_void_p, c_char_p, out_int]),
        "qm_method_name": (c_int32, [c_void_p, c_int32, out_text, out_int]),
        "qm_method_parameter": (c_int32, [c_void_p, c_int32, c_int32, out_text, out_int, out_int]),
        "qm_invoke": (c_int32, [c_void_p, c_int32, ctypes.POINTER(Variant), c_int32,
                                ctypes.POINTER(Variant)]),
        "qm_variant_clear": (None, [ctypes.POINTER(Variant)]),
        "qm_error_description": (c_char_p, []),
        "qm_error_source": (c_char_p, []),
        "qm_object_count": (c_int32, []),
        "qm_can_unload_now": (c_int32, []),
        "qm_version": (c_char_p, []),
    }
    for name, (restype, argtypes) in prototypes.items():
        function = getattr(library, name)
        function.restype = restype
        function.argtypes = argtypes
