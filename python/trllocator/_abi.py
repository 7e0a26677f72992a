"""The C ABI of include/trl/server.h in ctypes: values, identifiers, interface tables, codes."""
import ctypes
import uuid
from ctypes import POINTER, Structure, Union, c_char_p, c_int16, c_int32, c_uint8, c_uint16
from ctypes import c_uint32, c_void_p

S_OK = 0
S_FALSE = 1
E_NOINTERFACE = -0x7FFFBFFE  # 0x80004002
DISP_E_MEMBERNOTFOUND = -0x7FFDFFFD  # 0x80020003

VT_EMPTY, VT_I2, VT_I4, VT_TEXT, VT_DOCUMENT, VT_BOOL = 0, 2, 3, 8, 9, 11

DISPATCH_METHOD, DISPATCH_PROPERTYGET, DISPATCH_PROPERTYPUT = 1, 2, 4
DISPID_PROPERTYPUT = -3
GUIDKIND_DEFAULT_SOURCE_DISPIID = 1


class Guid(Structure):
    _fields_ = [("data1", c_uint32), ("data2", c_uint16), ("data3", c_uint16),
                ("data4", c_uint8 * 8)]

    @classmethod
    def parse(cls, text):
        """From "{XXXXXXXX-XXXX-XXXX-XXXX-XXXXXXXXXXXX}" (braces optional)."""
        value = uuid.UUID(text.strip("{}"))
        return cls(value.time_low, value.time_mid, value.time_hi_version,
                   (c_uint8 * 8)(*value.bytes[8:]))

    def __eq__(self, other):
        return bytes(self) == bytes(other)


IID_NULL = Guid()
IID_UNKNOWN = Guid.parse("00000000-0000-0000-C000-000000000046")
IID_CLASSFACTORY = Guid.parse("00000001-0000-0000-C000-000000000046")
IID_DISPATCH = Guid.parse("00020400-0000-0000-C000-000000000046")
IID_PROVIDECLASSINFO2 = Guid.parse("A6BC3AC0-DBAA-11CE-9DE3-00AA004BB851")
IID_CONNECTIONPOINTCONTAINER = Guid.parse("B196B284-BAB4-101A-B69C-00AA00341D07")


class _ValueUnion(Union):
    _fields_ = [("i2", c_int16), ("i4", c_int32), ("boolean", c_int16), ("error", c_int32),
                ("text", c_char_p), ("document", c_void_p), ("pointer", c_void_p)]


class Value(Structure):
    _fields_ = [("type", c_uint16), ("reserved", c_uint16 * 3), ("u", _ValueUnion)]


class Params(Structure):
    _fields_ = [("args", POINTER(Value)), ("namedArgs", POINTER(c_int32)),
                ("argCount", c_uint32), ("namedArgCount", c_uint32)]


Result = c_int32
QueryInterface = ctypes.CFUNCTYPE(Result, c_void_p, POINTER(Guid), POINTER(c_void_p))
AddRef = ctypes.CFUNCTYPE(c_uint32, c_void_p)
Release = ctypes.CFUNCTYPE(c_uint32, c_void_p)
_UNKNOWN = [("QueryInterface", QueryInterface), ("AddRef", AddRef), ("Release", Release)]


def _table(name, methods):
    return type(name, (Structure,), {"_fields_": _UNKNOWN + methods})


ClassFactoryTable = _table("ClassFactoryTable", [
    ("CreateInstance", ctypes.CFUNCTYPE(Result, c_void_p, c_void_p, POINTER(Guid),
                                        POINTER(c_void_p))),
    ("LockServer", ctypes.CFUNCTYPE(Result, c_void_p, c_int32))])
GetTypeInfoCount = ctypes.CFUNCTYPE(Result, c_void_p, POINTER(c_uint32))
GetTypeInfo = ctypes.CFUNCTYPE(Result, c_void_p, c_uint32, c_uint32, POINTER(c_void_p))
GetIDsOfNames = ctypes.CFUNCTYPE(Result, c_void_p, POINTER(Guid), POINTER(c_char_p), c_uint32,
                                 c_uint32, POINTER(c_int32))
Invoke = ctypes.CFUNCTYPE(Result, c_void_p, c_int32, POINTER(Guid), c_uint32, c_uint16,
                          POINTER(Params), POINTER(Value), c_void_p, POINTER(c_uint32))
DispatchTable = _table("DispatchTable", [
    ("GetTypeInfoCount", GetTypeInfoCount), ("GetTypeInfo", GetTypeInfo),
    ("GetIDsOfNames", GetIDsOfNames), ("Invoke", Invoke)])
ProvideClassInfo2Table = _table("ProvideClassInfo2Table", [
    ("GetClassInfo", ctypes.CFUNCTYPE(Result, c_void_p, POINTER(c_void_p))),
    ("GetGUID", ctypes.CFUNCTYPE(Result, c_void_p, c_uint32, POINTER(Guid)))])
ConnectionPointContainerTable = _table("ConnectionPointContainerTable", [
    ("EnumConnectionPoints", ctypes.CFUNCTYPE(Result, c_void_p, POINTER(c_void_p))),
    ("FindConnectionPoint", ctypes.CFUNCTYPE(Result, c_void_p, POINTER(Guid),
                                             POINTER(c_void_p)))])
ConnectionPointTable = _table("ConnectionPointTable", [
    ("GetConnectionInterface", ctypes.CFUNCTYPE(Result, c_void_p, POINTER(Guid))),
    ("GetConnectionPointContainer", ctypes.CFUNCTYPE(Result, c_void_p, POINTER(c_void_p))),
    ("Advise", ctypes.CFUNCTYPE(Result, c_void_p, c_void_p, POINTER(c_uint32))),
    ("Unadvise", ctypes.CFUNCTYPE(Result, c_void_p, c_uint32)),
    ("EnumConnections", ctypes.CFUNCTYPE(Result, c_void_p, POINTER(c_void_p)))])


def table(pointer, kind):
    """The function table of the object at `pointer` (an address), as a `kind` structure."""
    return ctypes.cast(ctypes.cast(pointer, POINTER(c_void_p))[0], POINTER(kind)).contents


def bind(library):
    """Declares the exported functions' types on a loaded library."""
    signatures = {
        "DllGetClassObject": (Result, [POINTER(Guid), POINTER(Guid), POINTER(c_void_p)]),
        "DllCanUnloadNow": (Result, []),
        "DllRegisterServer": (Result, []),
        "DllUnregisterServer": (Result, []),
        "TrlPump": (Result, [c_uint32]),
        "TrlValueClear": (None, [POINTER(Value)]),
        "TrlStringFree": (None, [c_void_p]),
        "TrlDocumentCreate": (Result, [POINTER(c_void_p)]),
        "TrlDocumentAddRef": (c_uint32, [c_void_p]),
        "TrlDocumentRelease": (c_uint32, [c_void_p]),
        "TrlDocumentLoadXml": (Result, [c_void_p, c_char_p]),
        "TrlDocumentXml": (Result, [c_void_p, POINTER(c_void_p)]),
    }
    for name, (restype, argtypes) in signatures.items():
        function = getattr(library, name)
        function.restype, function.argtypes = restype, argtypes
    return library
