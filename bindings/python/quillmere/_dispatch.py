"""The API objects over the C interface: methods read from the library's own
method tables, arguments converted by parameter type, results returned."""

import ctypes
import inspect
import keyword
import threading

from . import _library as lib_types
from ._library import Variant

_lock = threading.Lock()
_loaded = None

_INT32 = (-(2**31), 2**31 - 1)
_INT16 = (-(2**15), 2**15 - 1)


def library():
    """The C library, loaded on first use."""
    global _loaded
    with _lock:
        if _loaded is None:
            _loaded = lib_types.load()
        return _loaded


class Error(Exception):
    """A method failed: the engine's description of the failure, the ProgID
    of the object that raised it (or "QuillmereAPI" for a call the interface
    itself refused) and the result code (0 when the method refused while
    reporting success)."""

    def __init__(self, description, source="", code=0):
        super().__init__(description)
        self.description = description
        self.source = source
        self.code = code


def _check(hr, what):
    if hr < 0:
        raise _last_error(hr, what)


def _last_error(hr, fallback):
    handle = library()
    description = (handle.qm_error_description() or b"").decode("utf-8", "replace")
    source = (handle.qm_error_source() or b"").decode("utf-8", "replace")
    return Error(description or fallback, source, hr)


class _Method:
    __slots__ = ("dispid", "name", "parameters", "result_type")

    def __init__(self, dispid, name, parameters, result_type):
        self.dispid = dispid
        self.name = name
        self.parameters = parameters  # [(name, type)] of the in parameters
        self.result_type = result_type  # None when the method gives nothing back


def _read_methods(handle):
    """Every method of the object's interface, from dispatch identifier 1 on."""
    lib = library()
    methods = []
    dispid = 1
    while True:
        name = ctypes.c_char_p()
        count = ctypes.c_int32()
        hr = lib.qm_method_name(handle, dispid, ctypes.byref(name), ctypes.byref(count))
        if hr == lib_types.DISP_E_MEMBERNOTFOUND:
            return methods
        _check(hr, f"qm_method_name({dispid}) failed")
        parameters = []
        result_type = None
        for index in range(count.value):
            pname = ctypes.c_char_p()
            ptype = ctypes.c_int32()
            is_result = ctypes.c_int32()
            _check(lib.qm_method_parameter(handle, dispid, index, ctypes.byref(pname),
                                           ctypes.byref(ptype), ctypes.byref(is_result)),
                   f"qm_method_parameter({dispid}, {index}) failed")
            if is_result.value:
                result_type = ptype.value
            else:
                parameters.append((pname.value.decode("utf-8"), ptype.value))
        methods.append(_Method(dispid, name.value.decode("utf-8"), parameters, result_type))
        dispid += 1


def _python_name(name, index, taken):
    """A parameter name usable in a Python signature."""
    if not name.isidentifier() or keyword.iskeyword(name) or name in taken:
        name = f"arg{index + 1}"
    return name


# The Python type a parameter or result of each variant type shows as.
_PYTHON_TYPES = {lib_types.VT_I4: int, lib_types.VT_R8: float, lib_types.VT_BOOL: bool,
                 lib_types.VT_UTF16: str}


def _make_function(method):
    """The method as a function of the class, with the in parameters as its
    signature (annotated with their Python types) and its dispatch identifier
    as the attribute dispid."""
    params = [inspect.Parameter("self", inspect.Parameter.POSITIONAL_ONLY)]
    taken = {"self"}
    for index, (name, vt) in enumerate(method.parameters):
        name = _python_name(name, index, taken)
        taken.add(name)
        params.append(inspect.Parameter(name, inspect.Parameter.POSITIONAL_OR_KEYWORD,
                                        annotation=_PYTHON_TYPES.get(vt, object)))
    returns = _PYTHON_TYPES.get(method.result_type) if method.result_type is not None else None
    signature = inspect.Signature(params, return_annotation=returns)

    def call(self, *args, **kwargs):
        bound = signature.bind(self, *args, **kwargs)
        return self._invoke(method, list(bound.arguments.values())[1:])

    call.__name__ = method.name
    call.__qualname__ = method.name
    call.__signature__ = signature
    call.__doc__ = f"{method.name}, dispatch identifier {method.dispid}."
    call.dispid = method.dispid
    return call


def _in_range(value, bounds, parameter, method):
    if not bounds[0] <= value <= bounds[1]:
        raise OverflowError(f"{method.name}: {parameter} = {value} is out of range "
                            f"{bounds[0]}..{bounds[1]}")
    return value


def _to_variant(value, parameter, method, out, keep):
    """Fills out with value as the parameter's type; TypeError when it is not
    one. keep holds the buffers the variant points into."""
    name, vt = parameter
    if vt == lib_types.VT_UTF16:
        if value is None:
            out.type = lib_types.VT_EMPTY
            return
        if isinstance(value, str):
            encoded = value.encode("utf-8", "surrogateescape")
            buffer = ctypes.create_string_buffer(encoded, len(encoded) + 1)
            keep.append(buffer)
            out.type = lib_types.VT_UTF8
            out.value.utf8.data = ctypes.addressof(buffer)
            out.value.utf8.length = len(encoded)
            return
    elif vt == lib_types.VT_BOOL:
        # True is the interface's -1; an integer goes as given, so 1 stays 1.
        if isinstance(value, bool):
            out.type = lib_types.VT_BOOL
            out.value.boolean = -1 if value else 0
            return
        if isinstance(value, int):
            out.type = lib_types.VT_BOOL
            out.value.boolean = _in_range(value, _INT16, name, method)
            return
    elif vt == lib_types.VT_I4:
        if isinstance(value, float) and value.is_integer():
            value = int(value)
        if isinstance(value, int):
            out.type = lib_types.VT_I4
            out.value.i4 = _in_range(int(value), _INT32, name, method)
            return
    elif vt == lib_types.VT_R8:
        if isinstance(value, (int, float)):
            out.type = lib_types.VT_R8
            out.value.r8 = float(value)
            return
    wanted = {lib_types.VT_UTF16: "a str or None", lib_types.VT_BOOL: "a bool or an int",
              lib_types.VT_I4: "an int", lib_types.VT_R8: "a number"}.get(vt, "a value")
    raise TypeError(f"{method.name}: {name} must be {wanted}, not {type(value).__name__}")


def _from_variant(variant):
    vt = variant.type
    if vt == lib_types.VT_I4:
        return variant.value.i4
    if vt == lib_types.VT_R8:
        return variant.value.r8
    if vt == lib_types.VT_BOOL:
        # The engine's booleans are 1 or -1 for true: any non-zero value is.
        return variant.value.boolean != 0
    if vt == lib_types.VT_UTF8:
        text = variant.value.utf8
        if not text.data:
            return ""
        return ctypes.string_at(text.data, text.length).decode("utf-8", "surrogateescape")
    return None


class DispatchObject:
    """An object of the library, called through its dispatch interface. The
    interface's methods are attributes of the class, read from the library
    when the first object is made; names also match without regard to case.
    Call an object from one thread at a time."""

    _prog_id = None
    _handle = None
    _methods = None  # lower-case name -> _Method, once read
    _methods_lock = threading.Lock()

    def __init__(self):
        handle = ctypes.c_void_p()
        lib = library()
        hr = lib.qm_create(self._prog_id.encode("utf-8"), ctypes.byref(handle))
        _check(hr, f"cannot create {self._prog_id}")
        self._handle = handle
        type(self)._bind_methods(handle)

    @classmethod
    def _bind_methods(cls, handle):
        with cls._methods_lock:
            if cls.__dict__.get("_methods") is not None:
                return
            methods = _read_methods(handle)
            for method in methods:
                setattr(cls, method.name, _make_function(method))
            cls._methods = {method.name.lower(): method for method in methods}

    def __getattr__(self, name):
        # Only called for names the class lacks: the case-insensitive match.
        methods = type(self).__dict__.get("_methods")
        method = methods.get(name.lower()) if methods and not name.startswith("_") else None
        if method is None:
            raise AttributeError(f"{type(self).__name__} has no method {name}")
        return getattr(self, method.name)

    def _invoke(self, method, values):
        handle = self._handle
        if handle is None:
            raise ValueError(f"{type(self).__name__}.{method.name}: the object was released")
        lib = library()
        count = len(values)
        args = (Variant * max(count, 1))()
        keep = []
        for index, value in enumerate(values):
            _to_variant(value, method.parameters[index], method, args[index], keep)
        result = Variant()
        hr = lib.qm_invoke(handle, method.dispid, args, count, ctypes.byref(result))
        try:
            # A method may refuse while reporting success: its text says so.
            if hr < 0 or lib.qm_error_description():
                raise _last_error(hr, f"{method.name} failed (0x{hr & 0xFFFFFFFF:08X})")
            return _from_variant(result) if method.result_type is not None else None
        finally:
            lib.qm_variant_clear(ctypes.byref(result))

    @property
    def prog_id(self):
        """The object's versioned ProgID."""
        return self._prog_id

    def release(self):
        """Gives the object's reference back; later calls raise ValueError.
        Garbage collection and leaving a with block do the same."""
        handle, self._handle = self._handle, None
        if handle is not None and _loaded is not None:
            _loaded.qm_release(handle)

    def __enter__(self):
        return self

    def __exit__(self, *exc_info):
        self.release()

    def __del__(self):
        try:
            self.release()
        except Exception:  # interpreter shutdown: the library may be gone
            pass

    def __repr__(self):
        state = "released" if self._handle is None else "live"
        return f"<quillmere.{type(self).__name__} {self._prog_id} ({state})>"
