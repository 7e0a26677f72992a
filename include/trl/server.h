/* trlLocator for client programs: a C ABI (C99) to the component's five classes, shaped after the
 * binary object model of the component's home platform, so that any language with a C foreign
 * function interface can drive it.
 *
 * Finding and creating a class. Registration (DllRegisterServer) writes one line per class to the
 * registry file: "<programmatic name>\t{<class identifier>}\t<library path>\n". The per-user file
 * is $XDG_DATA_HOME/trllocator/classes (~/.local/share/trllocator/classes when XDG_DATA_HOME is
 * unset or not absolute); run as root with TRLLOCATOR_SYSTEM_REGISTRY=1 in the environment,
 * registration writes /var/lib/trllocator/classes instead. A client looks a programmatic name such
 * as "trlLocator.Locate" up in the per-user file, then the system-wide one; loads the library at
 * that path (dlopen); calls its DllGetClassObject with the class identifier and
 * TRL_IID_CLASSFACTORY; and calls the factory's CreateInstance with TRL_IID_DISPATCH. Programs
 * linked with the library may use TrlClassIdFromProgId instead of the registry.
 *
 * Objects. Every object is a pointer to a struct whose first member points to a table of functions;
 * each function takes the object itself first. The first three are QueryInterface, AddRef and
 * Release: every pointer handed out counts one reference, and the holder releases it. An object
 * belongs to the thread that created it: call it, and TrlPump, only from that thread.
 *
 * Members. A class's members are reached by late binding: GetIDsOfNames gives a member's dispatch
 * id, Invoke calls it with TRL_DISPATCH_PROPERTYGET, TRL_DISPATCH_PROPERTYPUT or
 * TRL_DISPATCH_METHOD and the arguments as tagged values, LAST ARGUMENT FIRST in the array. Every
 * class has Asynchronous (Boolean, read and write), Status (read), Start (returns text) and
 * Cancel(); Locate adds LogFile (text, read and write) and Mode (read). Start's arguments:
 *   Search   objSearchOptionsDOM [, objApplicationOptionsDOM [, objFingerprintDOM [,
 * objResultsDOM]]] Compare  objApplicationOptionsDOM, objLocalFilesDOM, objFingerprintDOM Filter
 * intFilterOptions (16-bit), objMatchesDOM Merge    objSearchOptionsDOM, objApplicationOptionsDOM,
 * objOldResultsDOM, objNewResultsDOM Locate   objSearchOptionsDOM, objApplicationOptionsDOM,
 * intFilterOptions (16-bit), objFingerprintDOM [, objUserDataDOM] The four stage classes change the
 * documents they are given, as the caller's own documents, and a document passed by reference
 * (TRL_VT_DOCUMENT | TRL_VT_BYREF) may come back replaced (Search puts a new document where
 * objResultsDOM held none). Locate takes its documents in only: it never replaces a handle, though
 * its stages still write into the documents (Compare's bit values into the fingerprint, Merge's
 * results into the user data).
 *
 * Events. Asynchronous runs report through the class's event interface, found with
 * TRL_IID_PROVIDECLASSINFO2's GetGUID(TRL_GUIDKIND_DEFAULT_SOURCE_DISPIID). A client connects a
 * sink, an object of its own with the TrlDispatch layout that answers QueryInterface for that
 * interface, through TRL_IID_CONNECTIONPOINTCONTAINER's FindConnectionPoint and the point's Advise,
 * and gets StatusUpdate (dispatch id 1; strUpdateXML, strResultsXML) and ProgressUpdate (dispatch
 * id 2; strUpdateXML) as calls of the sink's Invoke, arguments last first. The texts live for the
 * call only. Events arrive only while the client's thread is inside a call to the library: an
 * asynchronous Start, and the TrlPump with which the client lets the run go on.
 *
 * Text is UTF-8, NUL-terminated. Text the library hands out is freed with TrlStringFree (or with
 * the value holding it, by TrlValueClear); text handed in stays the caller's.
 */
#ifndef TRL_SERVER_H_
#define TRL_SERVER_H_

#include <stdint.h>

#define TRL_SERVER_API __attribute__((visibility("default")))

#ifdef __cplusplus
extern "C" {
#endif

/* Result codes: 0 and 1 succeed, negative values fail. */
typedef int32_t TrlResult;
#define TRL_S_OK ((TrlResult)0)
#define TRL_S_FALSE ((TrlResult)1)
#define TRL_E_NOTIMPL ((TrlResult)0x80004001)
#define TRL_E_NOINTERFACE ((TrlResult)0x80004002)
#define TRL_E_POINTER ((TrlResult)0x80004003)
#define TRL_E_FAIL ((TrlResult)0x80004005)
#define TRL_E_ACCESSDENIED ((TrlResult)0x80070005)
#define TRL_E_OUTOFMEMORY ((TrlResult)0x8007000E)
#define TRL_E_INVALIDARG ((TrlResult)0x80070057)
#define TRL_E_WRONG_THREAD ((TrlResult)0x8001010E)
#define TRL_DISP_E_UNKNOWNINTERFACE ((TrlResult)0x80020001)
#define TRL_DISP_E_MEMBERNOTFOUND ((TrlResult)0x80020003)
#define TRL_DISP_E_PARAMNOTFOUND ((TrlResult)0x80020004)
#define TRL_DISP_E_TYPEMISMATCH ((TrlResult)0x80020005)
#define TRL_DISP_E_UNKNOWNNAME ((TrlResult)0x80020006)
#define TRL_DISP_E_OVERFLOW ((TrlResult)0x8002000A)
#define TRL_DISP_E_BADINDEX ((TrlResult)0x8002000B)
#define TRL_DISP_E_BADPARAMCOUNT ((TrlResult)0x8002000E)
#define TRL_DISP_E_PARAMNOTOPTIONAL ((TrlResult)0x8002000F)
#define TRL_CLASS_E_NOAGGREGATION ((TrlResult)0x80040110)
#define TRL_CLASS_E_CLASSNOTAVAILABLE ((TrlResult)0x80040111)
#define TRL_CONNECT_E_NOCONNECTION ((TrlResult)0x80040200)
#define TRL_CONNECT_E_CANNOTCONNECT ((TrlResult)0x80040202)
#define TRL_SELFREG_E_CLASS ((TrlResult)0x80040201)

/* A 128-bit identifier; its text form is {XXXXXXXX-XXXX-XXXX-XXXX-XXXXXXXXXXXX}. */
typedef struct TrlGuid {
  uint32_t data1;
  uint16_t data2;
  uint16_t data3;
  uint8_t data4[8];
} TrlGuid;

/* The platform's interface identifiers, as initialisers: TrlGuid iid = TRL_IID_DISPATCH; */
#define TRL_IID_NULL                    \
  {                                     \
    0, 0, 0, { 0, 0, 0, 0, 0, 0, 0, 0 } \
  }
#define TRL_IID_UNKNOWN                                          \
  {                                                              \
    0x00000000, 0x0000, 0x0000, { 0xC0, 0, 0, 0, 0, 0, 0, 0x46 } \
  }
#define TRL_IID_CLASSFACTORY                                     \
  {                                                              \
    0x00000001, 0x0000, 0x0000, { 0xC0, 0, 0, 0, 0, 0, 0, 0x46 } \
  }
#define TRL_IID_DISPATCH                                         \
  {                                                              \
    0x00020400, 0x0000, 0x0000, { 0xC0, 0, 0, 0, 0, 0, 0, 0x46 } \
  }
#define TRL_IID_PROVIDECLASSINFO                                                   \
  {                                                                                \
    0xB196B283, 0xBAB4, 0x101A, { 0xB6, 0x9C, 0x00, 0xAA, 0x00, 0x34, 0x1D, 0x07 } \
  }
#define TRL_IID_PROVIDECLASSINFO2                                                  \
  {                                                                                \
    0xA6BC3AC0, 0xDBAA, 0x11CE, { 0x9D, 0xE3, 0x00, 0xAA, 0x00, 0x4B, 0xB8, 0x51 } \
  }
#define TRL_IID_CONNECTIONPOINTCONTAINER                                           \
  {                                                                                \
    0xB196B284, 0xBAB4, 0x101A, { 0xB6, 0x9C, 0x00, 0xAA, 0x00, 0x34, 0x1D, 0x07 } \
  }
#define TRL_IID_CONNECTIONPOINT                                                    \
  {                                                                                \
    0xB196B286, 0xBAB4, 0x101A, { 0xB6, 0x9C, 0x00, 0xAA, 0x00, 0x34, 0x1D, 0x07 } \
  }

/* An XML document, shared by reference count. */
typedef struct TrlDocument TrlDocument;

/* Tagged values. A Boolean is -1 (true) or 0 (false). An omitted optional argument is TRL_VT_EMPTY
 * or TRL_VT_ERROR holding TRL_DISP_E_PARAMNOTFOUND; a document of no object is TRL_VT_DOCUMENT with
 * a null pointer. TRL_VT_BYREF joined to a type points to a value of that type instead. */
typedef uint16_t TrlValueType;
#define TRL_VT_EMPTY ((TrlValueType)0)
#define TRL_VT_I2 ((TrlValueType)2)
#define TRL_VT_I4 ((TrlValueType)3)
#define TRL_VT_TEXT ((TrlValueType)8)
#define TRL_VT_DOCUMENT ((TrlValueType)9)
#define TRL_VT_ERROR ((TrlValueType)10)
#define TRL_VT_BOOL ((TrlValueType)11)
#define TRL_VT_BYREF ((TrlValueType)0x4000)

typedef struct TrlValue {
  TrlValueType type;
  uint16_t reserved[3];
  union {
    int16_t i2;
    int32_t i4;
    int16_t boolean;
    TrlResult error;
    char* text;
    TrlDocument* document;
    int16_t* i2Ref;
    int32_t* i4Ref;
    int16_t* booleanRef;
    char** textRef;
    TrlDocument** documentRef;
  } u;
} TrlValue;

typedef int32_t TrlDispId;
#define TRL_DISPID_UNKNOWN ((TrlDispId)-1)
#define TRL_DISPID_PROPERTYPUT ((TrlDispId)-3)

#define TRL_DISPATCH_METHOD ((uint16_t)1)
#define TRL_DISPATCH_PROPERTYGET ((uint16_t)2)
#define TRL_DISPATCH_PROPERTYPUT ((uint16_t)4)
#define TRL_DISPATCH_PROPERTYPUTREF ((uint16_t)8)

/* Arguments of Invoke: `args` holds argCount values, the last argument first; its first
 * namedArgCount values are named by `namedArgs` (parameter positions from GetIDsOfNames, or
 * TRL_DISPID_PROPERTYPUT for the value of a property put, which may also be passed unnamed). */
typedef struct TrlParams {
  TrlValue* args;
  TrlDispId* namedArgs;
  uint32_t argCount;
  uint32_t namedArgCount;
} TrlParams;

#define TRL_UNKNOWN_METHODS(Self)                                              \
  TrlResult (*QueryInterface)(Self * self, const TrlGuid* iid, void** object); \
  uint32_t (*AddRef)(Self * self);                                             \
  uint32_t (*Release)(Self * self)

typedef struct TrlUnknown {
  const struct TrlUnknownVtbl* vtbl;
} TrlUnknown;
typedef struct TrlUnknownVtbl {
  TRL_UNKNOWN_METHODS(TrlUnknown);
} TrlUnknownVtbl;

typedef struct TrlClassFactory {
  const struct TrlClassFactoryVtbl* vtbl;
} TrlClassFactory;
typedef struct TrlClassFactoryVtbl {
  TRL_UNKNOWN_METHODS(TrlClassFactory);
  /* `outer` must be null: the classes cannot be aggregated. */
  TrlResult (*CreateInstance)(TrlClassFactory* self, TrlUnknown* outer, const TrlGuid* iid,
                              void** object);
  /* Non-zero adds a lock that keeps the library loaded, zero removes one. */
  TrlResult (*LockServer)(TrlClassFactory* self, int32_t lock);
} TrlClassFactoryVtbl;

/* Late binding; also the layout of an event sink. No type information is offered: the count is 0
 * and GetTypeInfo answers TRL_DISP_E_BADINDEX. `iid` must be null or TRL_IID_NULL; `lcid` is
 * ignored and names match regardless of case. Invoke's `exceptionInfo` is never written: the
 * members report their own failures through the run's events and never raise. */
typedef struct TrlDispatch {
  const struct TrlDispatchVtbl* vtbl;
} TrlDispatch;
typedef struct TrlDispatchVtbl {
  TRL_UNKNOWN_METHODS(TrlDispatch);
  TrlResult (*GetTypeInfoCount)(TrlDispatch* self, uint32_t* count);
  TrlResult (*GetTypeInfo)(TrlDispatch* self, uint32_t index, uint32_t lcid, void** typeInfo);
  /* names[0] is a member, names[1..] its parameters; each id is written (TRL_DISPID_UNKNOWN for a
   * name not known, with TRL_DISP_E_UNKNOWNNAME). */
  TrlResult (*GetIDsOfNames)(TrlDispatch* self, const TrlGuid* iid, const char* const* names,
                             uint32_t count, uint32_t lcid, TrlDispId* ids);
  /* `result` may be null; otherwise it receives the member's value (TRL_VT_EMPTY for none), which
   * the caller clears. `argError`, when not null, receives the index in params->args of the
   * argument at fault when one is (a type mismatch, an overflow, a name or value not allowed). */
  TrlResult (*Invoke)(TrlDispatch* self, TrlDispId member, const TrlGuid* iid, uint32_t lcid,
                      uint16_t flags, TrlParams* params, TrlValue* result, void* exceptionInfo,
                      uint32_t* argError);
} TrlDispatchVtbl;

#define TRL_GUIDKIND_DEFAULT_SOURCE_DISPIID ((uint32_t)1)

/* Answers TRL_IID_PROVIDECLASSINFO too. No type information is offered (GetClassInfo answers
 * TRL_E_NOTIMPL); GetGUID gives the class's event interface. */
typedef struct TrlProvideClassInfo2 {
  const struct TrlProvideClassInfo2Vtbl* vtbl;
} TrlProvideClassInfo2;
typedef struct TrlProvideClassInfo2Vtbl {
  TRL_UNKNOWN_METHODS(TrlProvideClassInfo2);
  TrlResult (*GetClassInfo)(TrlProvideClassInfo2* self, void** typeInfo);
  TrlResult (*GetGUID)(TrlProvideClassInfo2* self, uint32_t kind, TrlGuid* guid);
} TrlProvideClassInfo2Vtbl;

struct TrlConnectionPoint;

/* Enumeration is not offered (TRL_E_NOTIMPL): each class has one connection point, for its event
 * interface. */
typedef struct TrlConnectionPointContainer {
  const struct TrlConnectionPointContainerVtbl* vtbl;
} TrlConnectionPointContainer;
typedef struct TrlConnectionPointContainerVtbl {
  TRL_UNKNOWN_METHODS(TrlConnectionPointContainer);
  TrlResult (*EnumConnectionPoints)(TrlConnectionPointContainer* self, void** enumerator);
  TrlResult (*FindConnectionPoint)(TrlConnectionPointContainer* self, const TrlGuid* iid,
                                   struct TrlConnectionPoint** point);
} TrlConnectionPointContainerVtbl;

/* Advise holds a reference to the sink until Unadvise (or the object's end); cookies start at 1.
 * Enumeration of the connections is not offered (TRL_E_NOTIMPL). */
typedef struct TrlConnectionPoint {
  const struct TrlConnectionPointVtbl* vtbl;
} TrlConnectionPoint;
typedef struct TrlConnectionPointVtbl {
  TRL_UNKNOWN_METHODS(TrlConnectionPoint);
  TrlResult (*GetConnectionInterface)(TrlConnectionPoint* self, TrlGuid* iid);
  TrlResult (*GetConnectionPointContainer)(TrlConnectionPoint* self,
                                           TrlConnectionPointContainer** container);
  TrlResult (*Advise)(TrlConnectionPoint* self, TrlUnknown* sink, uint32_t* cookie);
  TrlResult (*Unadvise)(TrlConnectionPoint* self, uint32_t cookie);
  TrlResult (*EnumConnections)(TrlConnectionPoint* self, void** enumerator);
} TrlConnectionPointVtbl;

/* The in-process server's entry points. DllCanUnloadNow answers TRL_S_OK only when no object,
 * document or factory of the library is alive and no lock is held, else TRL_S_FALSE. Registration
 * answers TRL_SELFREG_E_CLASS when the registry file cannot be written, TRL_E_ACCESSDENIED when the
 * system-wide file is asked for by a user other than root. Unregistration removes exactly the
 * lines this library's registration writes. On Windows the platform's headers declare them, with
 * its own types, for the module the Windows build makes. */
#ifndef _WIN32
TRL_SERVER_API TrlResult DllGetClassObject(const TrlGuid* clsid, const TrlGuid* iid, void** object);
TRL_SERVER_API TrlResult DllCanUnloadNow(void);
TRL_SERVER_API TrlResult DllRegisterServer(void);
TRL_SERVER_API TrlResult DllUnregisterServer(void);
#endif

/* The class identifier of one of this library's programmatic names; TRL_E_INVALIDARG otherwise. */
TRL_SERVER_API TrlResult TrlClassIdFromProgId(const char* progId, TrlGuid* clsid);

/* Runs what is due on this thread's event loop (timer ticks, the runs they start, their events),
 * then waits at most `waitMilliseconds` for what falls due next and runs that too. A host with a
 * loop of its own calls TrlPump(0) from it; a program without one loops on TrlPump(50). */
TRL_SERVER_API TrlResult TrlPump(uint32_t waitMilliseconds);

/* A copy of `text` (null gives null); null when memory runs out. */
TRL_SERVER_API char* TrlStringAlloc(const char* text);
TRL_SERVER_API void TrlStringFree(char* text);
/* Frees the text or releases the document a value holds (nothing for TRL_VT_BYREF) and leaves it
 * TRL_VT_EMPTY. */
TRL_SERVER_API void TrlValueClear(TrlValue* value);

/* A new empty document, with one reference. */
TRL_SERVER_API TrlResult TrlDocumentCreate(TrlDocument** document);
TRL_SERVER_API uint32_t TrlDocumentAddRef(TrlDocument* document);
TRL_SERVER_API uint32_t TrlDocumentRelease(TrlDocument* document);
/* Replaces the content with the parsed text: TRL_S_OK, or TRL_S_FALSE (the document is then empty)
 * when it is not well-formed XML. */
TRL_SERVER_API TrlResult TrlDocumentLoadXml(TrlDocument* document, const char* text);
/* The whole document as text ("" without content), to be freed with TrlStringFree. */
TRL_SERVER_API TrlResult TrlDocumentXml(TrlDocument* document, char** text);

#ifdef __cplusplus
}
#endif

#endif /* TRL_SERVER_H_ */
