"""A Python client of trlLocator's in-process server, with the standard library's ctypes only.

    import trllocator
    trllocator.register("/usr/lib/x86_64-linux-gnu/libtrllocator.so.0.1")    # once, as an installer would
    locate = trllocator.create("trlLocator.Locate")
    locate.LogFile = "/tmp/locate.log"                         # properties by name
    locate.connect(status_update=lambda update, results: ...,  # events
                   progress_update=lambda update: ...)
    locate.Start(trllocator.Document(text), ...)               # "" at once: asynchronous
    while running: trllocator.pump(50)                          # the run goes on while pumped

Objects belong to the thread that created them; events arrive only inside Start and pump().
"""
import ctypes
import os
from ctypes import POINTER, byref, c_char_p, c_int32, c_uint32, c_void_p

from . import _abi
from ._abi import Guid

SYSTEM_REGISTRY = "/var/lib/trllocator/classes"


class Error(Exception):
    """A failing result code of the library."""

    def __init__(self, code, what):
        self.code = code
        super().__init__(f"{what}: 0x{code & 0xFFFFFFFF:08X}")


def _check(code, what):
    if code < 0:
        raise Error(code, what)
    return code


def user_registry():
    """The per-user registry file, as the library's registration writes it."""
    data_home = os.environ.get("XDG_DATA_HOME", "")
    if not data_home.startswith("/"):
        data_home = os.path.join(os.path.expanduser("~"), ".local", "share")
    return os.path.join(data_home, "trllocator", "classes")


def find_class(prog_id):
    """The class identifier (text) and library path of a programmatic name: from the per-user
    registry, else the system-wide one."""
    for registry in (user_registry(), SYSTEM_REGISTRY):
        try:
            with open(registry, encoding="utf-8") as lines:
                for line in lines:
                    fields = line.rstrip("\n").split("\t", 2)
                    if len(fields) == 3 and fields[0].lower() == prog_id.lower():
                        return fields[1], fields[2]
        except FileNotFoundError:
            continue
    raise LookupError(f"{prog_id} is not registered")


_libraries = {}
_current = None  # the library the last object came from; documents and pump() use it
_pending = []  # exceptions raised by event callbacks, raised again by pump()
# Connected sinks stay alive until disconnected: the library may still call them while an object
# that Python has let go finishes a run.
_sinks = {}


def _load(path):
    global _current
    if path not in _libraries:
        _libraries[path] = _abi.bind(ctypes.CDLL(path, mode=ctypes.RTLD_LOCAL))
    _current = _libraries[path]
    return _current


def register(library_path):
    """Registers the library's classes for this user (system-wide for root with
    TRLLOCATOR_SYSTEM_REGISTRY=1)."""
    _check(_load(os.path.abspath(library_path)).DllRegisterServer(), "DllRegisterServer")


def unregister(library_path):
    _check(_load(os.path.abspath(library_path)).DllUnregisterServer(), "DllUnregisterServer")


def pump(wait_milliseconds=0):
    """Runs what is due (ticks, the runs they start, their events), waiting at most this long for
    what falls due next."""
    _check(_current.TrlPump(wait_milliseconds), "TrlPump")
    if _pending:
        raise _pending.pop(0)


class Document:
    """An XML document of the library, passed to Start; stage classes change it in place."""

    def __init__(self, text=None, _handle=None):
        self._library = _current
        if _handle is None:
            _handle = c_void_p()
            _check(self._library.TrlDocumentCreate(byref(_handle)), "TrlDocumentCreate")
        self._handle = _handle
        if text is not None and self.load(text) != _abi.S_OK:
            raise ValueError("not well-formed XML")

    @classmethod
    def from_file(cls, path):
        with open(path, encoding="utf-8") as file:
            return cls(file.read())

    def load(self, text):
        return _check(self._library.TrlDocumentLoadXml(self._handle, text.encode()), "load")

    @property
    def xml(self):
        text = c_void_p()
        _check(self._library.TrlDocumentXml(self._handle, byref(text)), "xml")
        try:
            return ctypes.string_at(text.value).decode()
        finally:
            self._library.TrlStringFree(text)

    def __del__(self):
        if getattr(self, "_handle", None):
            self._library.TrlDocumentRelease(self._handle)
            self._handle = None


class _Sink:
    """An event sink: an object of the library's layout whose Invoke calls Python."""

    def __init__(self, event_interface, status_update, progress_update):
        self._event_interface = event_interface
        self._handlers = {1: status_update, 2: progress_update}
        self._functions = _abi.DispatchTable(
            _abi.QueryInterface(self._query), _abi.AddRef(lambda this: 1),
            _abi.Release(lambda this: 1), _abi.GetTypeInfoCount(self._no_types),
            _abi.GetTypeInfo(lambda *unused: _abi.E_NOINTERFACE),
            _abi.GetIDsOfNames(lambda *unused: _abi.DISP_E_MEMBERNOTFOUND),
            _abi.Invoke(self._invoke))
        self._table_address = c_void_p(ctypes.addressof(self._functions))
        self.pointer = ctypes.addressof(self._table_address)

    def _query(self, this, iid, out):
        if iid.contents in (_abi.IID_UNKNOWN, _abi.IID_DISPATCH, self._event_interface):
            out[0] = this
            return _abi.S_OK
        out[0] = None
        return _abi.E_NOINTERFACE

    @staticmethod
    def _no_types(this, count):
        count[0] = 0
        return _abi.S_OK

    def _invoke(self, this, member, iid, lcid, flags, params, result, exception, arg_error):
        handler = self._handlers.get(member)
        if handler is not None:
            p = params.contents
            texts = [p.args[i].u.text.decode() for i in reversed(range(p.argCount))]
            try:
                handler(*texts)
            except BaseException as error:  # raised again from pump()
                _pending.append(error)
        return _abi.S_OK


class Object:
    """An object of one of the component's classes; its members by name."""

    def __init__(self, library, pointer, prog_id):
        object.__setattr__(self, "_library", library)
        object.__setattr__(self, "_pointer", pointer)
        object.__setattr__(self, "_prog_id", prog_id)
        object.__setattr__(self, "_ids", {})

    def _table(self, pointer=None, kind=_abi.DispatchTable):
        return _abi.table(pointer or self._pointer, kind)

    def _id(self, name):
        if name not in self._ids:
            names = (c_char_p * 1)(name.encode())
            ids = (c_int32 * 1)()
            code = self._table().GetIDsOfNames(self._pointer, byref(_abi.IID_NULL), names, 1, 0,
                                               ids)
            if code < 0:
                raise AttributeError(f"{self._prog_id} has no member {name}")
            self._ids[name] = ids[0]
        return self._ids[name]

    def _invoke(self, name, flags, args):
        values = (_abi.Value * max(len(args), 1))()
        for i, arg in enumerate(reversed(args)):
            _to_value(arg, values[i])
        named = (c_int32 * 1)(_abi.DISPID_PROPERTYPUT)
        params = _abi.Params(values, named if flags == _abi.DISPATCH_PROPERTYPUT else None,
                             len(args), 1 if flags == _abi.DISPATCH_PROPERTYPUT else 0)
        result = _abi.Value()
        arg_error = c_uint32(0)
        code = self._table().Invoke(self._pointer, self._id(name), byref(_abi.IID_NULL), 0, flags,
                                    byref(params), byref(result), None, byref(arg_error))
        if code < 0:
            raise Error(code, f"{self._prog_id}.{name}")
        return _from_value(self._library, result)

    def __getattr__(self, name):
        if name.startswith("_"):
            raise AttributeError(name)
        try:
            return self._invoke(name, _abi.DISPATCH_PROPERTYGET, ())
        except Error as error:
            if error.code != _abi.DISP_E_MEMBERNOTFOUND:
                raise
        return lambda *args: self._invoke(name, _abi.DISPATCH_METHOD, args)

    def __setattr__(self, name, value):
        self._invoke(name, _abi.DISPATCH_PROPERTYPUT, (value,))

    def _interface(self, iid, kind):
        pointer = c_void_p()
        _check(self._table().QueryInterface(self._pointer, byref(iid), byref(pointer)),
               "QueryInterface")
        return pointer, self._table(pointer, kind)

    def _connection_point(self):
        info, info_table = self._interface(_abi.IID_PROVIDECLASSINFO2,
                                           _abi.ProvideClassInfo2Table)
        events = Guid()
        try:
            _check(info_table.GetGUID(info, _abi.GUIDKIND_DEFAULT_SOURCE_DISPIID, byref(events)),
                   "GetGUID")
        finally:
            info_table.Release(info)
        container, container_table = self._interface(_abi.IID_CONNECTIONPOINTCONTAINER,
                                                      _abi.ConnectionPointContainerTable)
        point = c_void_p()
        try:
            _check(container_table.FindConnectionPoint(container, byref(events), byref(point)),
                   "FindConnectionPoint")
        finally:
            container_table.Release(container)
        return events, point, self._table(point, _abi.ConnectionPointTable)

    def connect(self, status_update=None, progress_update=None):
        """Calls status_update(update_xml, results_xml) and progress_update(update_xml) on the
        events of asynchronous runs; returns the connection's cookie."""
        events, point, point_table = self._connection_point()
        sink = _Sink(events, status_update, progress_update)
        cookie = c_uint32()
        try:
            _check(point_table.Advise(point, sink.pointer, byref(cookie)), "Advise")
        finally:
            point_table.Release(point)
        _sinks[(self._pointer.value, cookie.value)] = sink
        return cookie.value

    def disconnect(self, cookie):
        events, point, point_table = self._connection_point()
        try:
            _check(point_table.Unadvise(point, cookie), "Unadvise")
        finally:
            point_table.Release(point)
        del _sinks[(self._pointer.value, cookie)]

    def release(self):
        """Lets the object go (it also goes with the last Python reference)."""
        if self._pointer:
            self._table().Release(self._pointer)
            object.__setattr__(self, "_pointer", None)

    def __del__(self):
        self.release()


def _to_value(arg, value):
    if isinstance(arg, bool):
        value.type, value.u.boolean = _abi.VT_BOOL, -1 if arg else 0
    elif isinstance(arg, int) and -32768 <= arg <= 32767:
        value.type, value.u.i2 = _abi.VT_I2, arg
    elif isinstance(arg, int):
        value.type, value.u.i4 = _abi.VT_I4, arg
    elif isinstance(arg, str):
        value.type, value.u.text = _abi.VT_TEXT, arg.encode()
    elif isinstance(arg, Document) or arg is None:
        value.type, value.u.document = _abi.VT_DOCUMENT, arg._handle if arg else None
    else:
        raise TypeError(f"cannot pass {type(arg).__name__}")


def _from_value(library, value):
    try:
        if value.type == _abi.VT_BOOL:
            return value.u.boolean != 0
        if value.type == _abi.VT_I2:
            return value.u.i2
        if value.type == _abi.VT_I4:
            return value.u.i4
        if value.type == _abi.VT_TEXT:
            return (value.u.text or b"").decode()
        return None
    finally:
        library.TrlValueClear(byref(value))


def create(prog_id):
    """An object of the class registered under `prog_id`, from the library the registry names."""
    class_id, path = find_class(prog_id)
    library = _load(path)
    factory = c_void_p()
    _check(library.DllGetClassObject(byref(Guid.parse(class_id)), byref(_abi.IID_CLASSFACTORY),
                                     byref(factory)), "DllGetClassObject")
    factory_table = _abi.table(factory, _abi.ClassFactoryTable)
    pointer = c_void_p()
    try:
        _check(factory_table.CreateInstance(factory, None, byref(_abi.IID_DISPATCH),
                                            byref(pointer)), "CreateInstance")
    finally:
        factory_table.Release(factory)
    return Object(library, pointer, prog_id)
