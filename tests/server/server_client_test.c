/* A client that knows only the public header and the programmatic names: it registers the library
 * given on its command line, then finds, loads and uses it only through the registry file. */
#define _XOPEN_SOURCE 700
#include <dlfcn.h>
#include <pthread.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/stat.h>
#include <unistd.h>

#include "trl/server.h"

static int failures;
#define CHECK(condition)                                                      \
  do {                                                                        \
    if (!(condition)) {                                                       \
      fprintf(stderr, "%s:%d: failed: %s\n", __FILE__, __LINE__, #condition); \
      ++failures;                                                             \
    }                                                                         \
  } while (0)
#define CHECK_RESULT(call, expected)                                                    \
  do {                                                                                  \
    TrlResult got_ = (call);                                                            \
    if (got_ != (expected)) {                                                           \
      fprintf(stderr, "%s:%d: %s gave 0x%08X, not 0x%08X\n", __FILE__, __LINE__, #call, \
              (unsigned)got_, (unsigned)(expected));                                    \
      ++failures;                                                                       \
    }                                                                                   \
  } while (0)

static const TrlGuid kNull = TRL_IID_NULL;
static const TrlGuid kDispatch = TRL_IID_DISPATCH;
static const TrlGuid kUnknown = TRL_IID_UNKNOWN;
static const TrlGuid kFactory = TRL_IID_CLASSFACTORY;
static const TrlGuid kClassInfo = TRL_IID_PROVIDECLASSINFO2;
static const TrlGuid kContainer = TRL_IID_CONNECTIONPOINTCONTAINER;

enum { GET = TRL_DISPATCH_PROPERTYGET, PUT = TRL_DISPATCH_PROPERTYPUT, CALL = TRL_DISPATCH_METHOD };

/* The classes as their type library gives them. */
typedef struct ExpectedMember {
  const char* name;
  TrlDispId id;
  uint16_t flags;
} ExpectedMember;
static const ExpectedMember kStageMembers[] = {
    {"Asynchronous", 0x68030001, GET}, {"Asynchronous", 0x68030001, PUT},
    {"Status", 0x68030000, GET},       {"Start", 0x60030002, CALL},
    {"Cancel", 0x60030003, CALL},      {NULL, 0, 0}};
static const ExpectedMember kSearchMembers[] = {
    {"Asynchronous", 0x68030001, GET}, {"Asynchronous", 0x68030001, PUT},
    {"Status", 0x68030000, GET},       {"Cancel", 0x60030002, CALL},
    {"Start", 0x60030003, CALL},       {NULL, 0, 0}};
static const ExpectedMember kLocateMembers[] = {{"Asynchronous", 0x68030003, PUT},
                                                {"Asynchronous", 0x68030003, GET},
                                                {"LogFile", 0x68030002, PUT},
                                                {"LogFile", 0x68030002, GET},
                                                {"Mode", 0x68030001, GET},
                                                {"Status", 0x68030000, GET},
                                                {"Start", 0x60030004, CALL},
                                                {"Cancel", 0x60030005, CALL},
                                                {NULL, 0, 0}};
static const struct Expected {
  const char *progId, *classId, *defaultId, *eventId;
  const ExpectedMember* members;
} kClasses[] = {{"trlLocator.Compare", "{C58C197B-8F7C-40E1-8EE6-835944A1049F}",
                 "{AF4C1C7A-C434-4304-B679-F94D471FB04D}", "{FEA3456A-570E-4868-9AE5-D72B5F2D0EBD}",
                 kStageMembers},
                {"trlLocator.Filter", "{4C1E74BE-E45A-48DC-A8A0-E718B7AFEE5A}",
                 "{9D54D732-4800-49E9-B718-1152E6D1130D}", "{03A7D178-CAB5-4010-A784-FFCBEAE67094}",
                 kStageMembers},
                {"trlLocator.Locate", "{9271413F-2B9A-42D9-95ED-E5E3CF6C0072}",
                 "{02F12903-3DE1-4AE6-8005-46CEA1F67FBB}", "{D4466B3B-5B80-401E-8A3D-0C21B609E7E9}",
                 kLocateMembers},
                {"trlLocator.Merge", "{1C048253-E86E-4B5A-BBB0-5B4FD327D28B}",
                 "{5B149139-0019-4E90-AA4B-405DD91561C8}", "{E07E4053-37B4-420E-A0B4-70FB6F023D5D}",
                 kStageMembers},
                {"trlLocator.Search", "{DCFC2C95-651D-46A8-A31E-6EE58125C2E3}",
                 "{C7593F0D-CF9E-450A-AF16-BD0AAE7AB1FE}", "{0159F6AA-64AE-4962-8A87-879E2F090366}",
                 kSearchMembers}};
enum { COMPARE, FILTER, LOCATE, MERGE, SEARCH, CLASSES };

/* The library's functions, found by name in the library the registry names. */
static struct {
  void* handle;
  TrlResult (*GetClassObject)(const TrlGuid*, const TrlGuid*, void**);
  TrlResult (*CanUnloadNow)(void);
  TrlResult (*Register)(void);
  TrlResult (*Unregister)(void);
  TrlResult (*Pump)(uint32_t);
  void (*ValueClear)(TrlValue*);
  TrlResult (*DocumentCreate)(TrlDocument**);
  uint32_t (*DocumentRelease)(TrlDocument*);
  TrlResult (*DocumentLoadXml)(TrlDocument*, const char*);
  TrlResult (*DocumentXml)(TrlDocument*, char**);
  void (*StringFree)(char*);
} lib;

static void Load(const char* path) {
  const struct {
    void* field;
    const char* name;
  } symbols[] = {{&lib.GetClassObject, "DllGetClassObject"},
                 {&lib.CanUnloadNow, "DllCanUnloadNow"},
                 {&lib.Register, "DllRegisterServer"},
                 {&lib.Unregister, "DllUnregisterServer"},
                 {&lib.Pump, "TrlPump"},
                 {&lib.ValueClear, "TrlValueClear"},
                 {&lib.DocumentCreate, "TrlDocumentCreate"},
                 {&lib.DocumentRelease, "TrlDocumentRelease"},
                 {&lib.DocumentLoadXml, "TrlDocumentLoadXml"},
                 {&lib.DocumentXml, "TrlDocumentXml"},
                 {&lib.StringFree, "TrlStringFree"}};
  lib.handle = dlopen(path, RTLD_NOW | RTLD_LOCAL);
  if (lib.handle == NULL) fprintf(stderr, "%s\n", dlerror()), exit(1);
  for (size_t i = 0; i < sizeof symbols / sizeof symbols[0]; ++i) {
    *(void**)symbols[i].field = dlsym(lib.handle, symbols[i].name);
    if (*(void**)symbols[i].field == NULL) fprintf(stderr, "no %s\n", symbols[i].name), exit(1);
  }
}

static char registryFile[4096];

static char* ReadFile(const char* path) {
  FILE* file = fopen(path, "rb");
  if (file == NULL) return NULL;
  char* text = calloc(1, 1 << 16);
  if (fread(text, 1, (1 << 16) - 1, file)) {
  }
  fclose(file);
  return text;
}

static void WriteFile(const char* path, const char* text) {
  FILE* file = fopen(path, "wb");
  fputs(text, file);
  fclose(file);
}

static int GuidEquals(const TrlGuid* a, const TrlGuid* b) { return memcmp(a, b, sizeof *a) == 0; }

static TrlGuid ParseGuid(const char* text) {
  TrlGuid guid;
  unsigned d[11];
  sscanf(text, "{%8x-%4x-%4x-%2x%2x-%2x%2x%2x%2x%2x%2x}", &d[0], &d[1], &d[2], &d[3], &d[4], &d[5],
         &d[6], &d[7], &d[8], &d[9], &d[10]);
  guid.data1 = d[0];
  guid.data2 = (uint16_t)d[1];
  guid.data3 = (uint16_t)d[2];
  for (int i = 0; i < 8; ++i) guid.data4[i] = (uint8_t)d[3 + i];
  return guid;
}

/* The class identifier and library of a programmatic name, as the registry gives them. */
static int FindClass(const char* progId, TrlGuid* classId, char* path) {
  char* text = ReadFile(registryFile);
  int found = 0;
  for (char* line = text ? strtok(text, "\n") : NULL; line && !found; line = strtok(NULL, "\n")) {
    char* tab = strchr(line, '\t');
    if (tab == NULL || (size_t)(tab - line) != strlen(progId) ||
        strncmp(line, progId, tab - line)) {
      continue;
    }
    *classId = ParseGuid(tab + 1);
    strcpy(path, strchr(tab + 1, '\t') + 1);
    found = 1;
  }
  free(text);
  return found;
}

static TrlDispatch* Create(int which) {
  TrlGuid classId;
  char path[4096];
  TrlClassFactory* factory = NULL;
  TrlDispatch* object = NULL;
  CHECK(FindClass(kClasses[which].progId, &classId, path));
  if (lib.handle == NULL) Load(path);
  CHECK_RESULT(lib.GetClassObject(&classId, &kFactory, (void**)&factory), TRL_S_OK);
  CHECK_RESULT(factory->vtbl->CreateInstance(factory, NULL, &kDispatch, (void**)&object), TRL_S_OK);
  factory->vtbl->Release(factory);
  return object;
}

static TrlValue Text(const char* text) {
  TrlValue value = {TRL_VT_TEXT, {0}, {0}};
  value.u.text = (char*)text;
  return value;
}
static TrlValue Number(TrlValueType type, int32_t number) {
  TrlValue value = {type, {0}, {0}};
  if (type == TRL_VT_I4)
    value.u.i4 = number;
  else
    value.u.i2 = (int16_t)number;
  return value;
}
static TrlValue Document(TrlDocument* document) {
  TrlValue value = {TRL_VT_DOCUMENT, {0}, {0}};
  value.u.document = document;
  return value;
}
static TrlValue DocumentRef(TrlDocument** document) {
  TrlValue value = {TRL_VT_DOCUMENT | TRL_VT_BYREF, {0}, {0}};
  value.u.documentRef = document;
  return value;
}

/* Invokes with `count` arguments given first to last; the call gets them last first. */
static TrlResult Invoke(TrlDispatch* object, TrlDispId id, uint16_t flags, TrlValue* result,
                        uint32_t* argError, uint32_t count, const TrlValue* args) {
  TrlValue reversed[8];
  for (uint32_t i = 0; i < count; ++i) reversed[count - 1 - i] = args[i];
  TrlParams params = {reversed, NULL, count, 0};
  return object->vtbl->Invoke(object, id, &kNull, 0x409, flags, &params, result, NULL, argError);
}

static int32_t Read(TrlDispatch* object, TrlDispId id, TrlValueType type) {
  TrlValue result = {TRL_VT_EMPTY, {0}, {0}};
  CHECK_RESULT(Invoke(object, id, GET, &result, NULL, 0, NULL), TRL_S_OK);
  CHECK(result.type == type);
  return type == TRL_VT_I4 ? result.u.i4 : result.u.i2;
}

static TrlDocument* NewDocument(const char* text) {
  TrlDocument* document = NULL;
  CHECK_RESULT(lib.DocumentCreate(&document), TRL_S_OK);
  if (text) CHECK_RESULT(lib.DocumentLoadXml(document, text), TRL_S_OK);
  return document;
}

static int Contains(TrlDocument* document, const char* part) {
  char* text = NULL;
  CHECK_RESULT(lib.DocumentXml(document, &text), TRL_S_OK);
  int found = strstr(text, part) != NULL;
  lib.StringFree(text);
  return found;
}

/* Starts `object` with arguments first to last; returns the result text's test for `part`. */
static int StartGives(TrlDispatch* object, TrlDispId start, uint32_t count, const TrlValue* args,
                      const char* part) {
  TrlValue result = {TRL_VT_EMPTY, {0}, {0}};
  CHECK_RESULT(Invoke(object, start, CALL, &result, NULL, count, args), TRL_S_OK);
  CHECK(result.type == TRL_VT_TEXT);
  int found = result.type == TRL_VT_TEXT && strstr(result.u.text, part) != NULL;
  lib.ValueClear(&result);
  return found;
}

/* A sink of events that records them and may act on one. */
typedef struct Sink {
  TrlDispatch face;
  int references;
  TrlGuid eventId;
  int count;
  struct {
    TrlDispId id;
    int mode, status;
  } events[64];
  char* lastResults;
  TrlDispatch* cancel;  /* cancelled at the first progress of a search */
  TrlDispatch* release; /* released at its last report */
  TrlDispId cancelId;
} Sink;

static int Attribute(const char* xml, const char* name) {
  const char* at = strstr(xml, name);
  return at ? atoi(at + strlen(name) + 2) : -1;
}

static TrlResult SinkQuery(TrlDispatch* self, const TrlGuid* iid, void** object) {
  Sink* sink = (Sink*)self;
  *object = NULL;
  if (!GuidEquals(iid, &kUnknown) && !GuidEquals(iid, &sink->eventId)) return TRL_E_NOINTERFACE;
  *object = self;
  ++sink->references;
  return TRL_S_OK;
}
static uint32_t SinkAddRef(TrlDispatch* self) { return ++((Sink*)self)->references; }
static uint32_t SinkRelease(TrlDispatch* self) { return --((Sink*)self)->references; }
static TrlResult SinkInvoke(TrlDispatch* self, TrlDispId id, const TrlGuid* iid, uint32_t lcid,
                            uint16_t flags, TrlParams* params, TrlValue* result, void* exception,
                            uint32_t* argError) {
  Sink* sink = (Sink*)self;
  (void)iid, (void)lcid, (void)result, (void)exception, (void)argError;
  CHECK(flags == CALL && params->argCount == (id == 1 ? 2u : 1u));
  for (uint32_t i = 0; i < params->argCount; ++i) CHECK(params->args[i].type == TRL_VT_TEXT);
  const char* update = params->args[params->argCount - 1].u.text;
  int mode = Attribute(update, "e_mode"), status = Attribute(update, "e_status");
  if (sink->count < 64) {
    sink->events[sink->count].id = id;
    sink->events[sink->count].mode = mode;
    sink->events[sink->count].status = status;
  }
  ++sink->count;
  if (id == 1) {
    free(sink->lastResults);
    sink->lastResults = strdup(params->args[0].u.text);
  }
  if (id == 2 && mode == 1 && sink->cancel) {
    CHECK_RESULT(Invoke(sink->cancel, sink->cancelId, CALL, NULL, NULL, 0, NULL), TRL_S_OK);
    sink->cancel = NULL;
  }
  if (id == 1 && (status == 3 || status == 255) && sink->release) {
    sink->release->vtbl->Release(sink->release);
    sink->release = NULL;
  }
  return TRL_S_OK;
}
/* The library never asks a sink for type information or names. */
static const TrlDispatchVtbl kSinkVtbl = {SinkQuery, SinkAddRef, SinkRelease, NULL,
                                          NULL,      NULL,       SinkInvoke};

/* Connects a new sink to the class's event interface, as a client finds it. */
static uint32_t Connect(TrlDispatch* object, Sink* sink, const char* expectedEventId) {
  TrlProvideClassInfo2* info = NULL;
  TrlConnectionPointContainer* container = NULL;
  TrlConnectionPoint* point = NULL;
  uint32_t cookie = 0;
  memset(sink, 0, sizeof *sink);
  sink->face.vtbl = &kSinkVtbl;
  CHECK_RESULT(object->vtbl->QueryInterface(object, &kClassInfo, (void**)&info), TRL_S_OK);
  CHECK_RESULT(info->vtbl->GetGUID(info, TRL_GUIDKIND_DEFAULT_SOURCE_DISPIID, &sink->eventId),
               TRL_S_OK);
  TrlGuid expected = ParseGuid(expectedEventId);
  CHECK(GuidEquals(&sink->eventId, &expected));
  CHECK_RESULT(object->vtbl->QueryInterface(object, &kContainer, (void**)&container), TRL_S_OK);
  CHECK_RESULT(container->vtbl->FindConnectionPoint(container, &kDispatch, &point),
               TRL_CONNECT_E_NOCONNECTION);
  CHECK_RESULT(container->vtbl->FindConnectionPoint(container, &sink->eventId, &point), TRL_S_OK);
  CHECK_RESULT(point->vtbl->Advise(point, (TrlUnknown*)&sink->face, &cookie), TRL_S_OK);
  CHECK(sink->references == 1);
  point->vtbl->Release(point);
  container->vtbl->Release(container);
  info->vtbl->Release(info);
  return cookie;
}

static void Disconnect(TrlDispatch* object, Sink* sink, uint32_t cookie) {
  TrlConnectionPointContainer* container = NULL;
  TrlConnectionPoint* point = NULL;
  object->vtbl->QueryInterface(object, &kContainer, (void**)&container);
  container->vtbl->FindConnectionPoint(container, &sink->eventId, &point);
  CHECK_RESULT(point->vtbl->Unadvise(point, cookie), TRL_S_OK);
  CHECK_RESULT(point->vtbl->Unadvise(point, cookie), TRL_CONNECT_E_NOCONNECTION);
  CHECK(sink->references == 0);
  point->vtbl->Release(point);
  container->vtbl->Release(container);
  free(sink->lastResults);
}

/* Pumps until the last report of a run whose end has mode `endMode`, or of a cancelled one. */
static void PumpUntilEnd(Sink* sink, int endMode) {
  for (int waited = 0; waited < 400; ++waited) {
    int last = sink->count - 1;
    if (last >= 0 && sink->events[last].id == 1 &&
        ((sink->events[last].mode == endMode && sink->events[last].status == 3) ||
         sink->events[last].status == 255)) {
      return;
    }
    lib.Pump(50);
  }
  CHECK(!"the run ended");
}

/* The status reports of a sink, "mode:status" each, space-separated. */
static const char* StatusReports(const Sink* sink) {
  static char text[1024];
  text[0] = '\0';
  for (int i = 0; i < sink->count && i < 64; ++i) {
    if (sink->events[i].id != 1) continue;
    sprintf(text + strlen(text), "%s%d:%d", text[0] ? " " : "", sink->events[i].mode,
            sink->events[i].status);
  }
  return text;
}

static TrlDispId Id(int which, const char* name, uint16_t flags) {
  for (int k = 0; kClasses[which].members[k].name; ++k) {
    if (!strcmp(kClasses[which].members[k].name, name) &&
        kClasses[which].members[k].flags == flags) {
      return kClasses[which].members[k].id;
    }
  }
  return TRL_DISPID_UNKNOWN;
}

/* Every member of the class by its name and its id: properties read and written, Cancel at rest;
 * the object is left synchronous. */
static void CheckMembers(int which, TrlDispatch* object) {
  const struct Expected* expected = &kClasses[which];
  TrlGuid defaultId = ParseGuid(expected->defaultId), other = ParseGuid(expected->eventId);
  void* face = NULL;
  CHECK_RESULT(object->vtbl->QueryInterface(object, &defaultId, &face), TRL_S_OK);
  CHECK(face == object);
  object->vtbl->Release(object);
  CHECK_RESULT(object->vtbl->QueryInterface(object, &other, &face), TRL_E_NOINTERFACE);
  for (int k = 0; expected->members[k].name; ++k) {
    TrlDispId id = 0;
    CHECK_RESULT(object->vtbl->GetIDsOfNames(object, &kNull, &expected->members[k].name, 1, 0, &id),
                 TRL_S_OK);
    CHECK(id == expected->members[k].id);
  }
  TrlValueType statusType = which == LOCATE ? TRL_VT_I4 : TRL_VT_I2;
  TrlValue no = Number(TRL_VT_BOOL, 0), result = {TRL_VT_EMPTY, {0}, {0}};
  CHECK(Read(object, Id(which, "Asynchronous", GET), TRL_VT_BOOL) == -1);
  CHECK_RESULT(Invoke(object, Id(which, "Asynchronous", PUT), PUT, NULL, NULL, 1, &no), TRL_S_OK);
  CHECK(Read(object, Id(which, "Asynchronous", GET), TRL_VT_BOOL) == 0);
  CHECK(Read(object, Id(which, "Status", GET), statusType) == 0);
  CHECK_RESULT(Invoke(object, Id(which, "Cancel", CALL), CALL, &result, NULL, 0, NULL), TRL_S_OK);
  CHECK(result.type == TRL_VT_EMPTY && Read(object, Id(which, "Status", GET), statusType) == 0);
  if (which != LOCATE) return;
  CHECK(Read(object, Id(which, "Mode", GET), TRL_VT_I4) == 0);
  /* The value of a put passed by name, as some clients do. */
  TrlValue name = Text("run.log");
  TrlDispId putName = TRL_DISPID_PROPERTYPUT;
  TrlParams named = {&name, &putName, 1, 1};
  CHECK_RESULT(object->vtbl->Invoke(object, 0x68030002, NULL, 0, PUT, &named, NULL, NULL, NULL),
               TRL_S_OK);
  CHECK_RESULT(Invoke(object, Id(which, "LogFile", GET), GET, &result, NULL, 0, NULL), TRL_S_OK);
  CHECK(result.type == TRL_VT_TEXT && !strcmp(result.u.text, "run.log"));
  lib.ValueClear(&result);
  name = Text("");
  CHECK_RESULT(Invoke(object, Id(which, "LogFile", PUT), PUT, NULL, NULL, 1, &name), TRL_S_OK);
}

/* Wrong ids, flags, types and counts give the platform's errors and change nothing. */
static void CheckRefusals(TrlDispatch* locate, TrlDispatch* filter, TrlDocument* document) {
  const struct {
    TrlDispatch* object;
    TrlDispId id;
    uint16_t flags;
    uint32_t count;
    TrlValue args[6];
    TrlResult expected;
    uint32_t argError;
  } cases[] = {
      {locate, 0x12345, CALL, 0, {{0}}, TRL_DISP_E_MEMBERNOTFOUND, 99},
      {locate, 0x68030000, PUT, 1, {Number(TRL_VT_I4, 3)}, TRL_DISP_E_MEMBERNOTFOUND, 99},
      {locate, 0x68030001, CALL, 0, {{0}}, TRL_DISP_E_MEMBERNOTFOUND, 99},
      {locate, 0x60030004, GET, 0, {{0}}, TRL_DISP_E_MEMBERNOTFOUND, 99},
      {locate, 0x68030003, PUT, 1, {Text("yes")}, TRL_DISP_E_TYPEMISMATCH, 0},
      {locate, 0x68030002, PUT, 1, {Document(document)}, TRL_DISP_E_TYPEMISMATCH, 0},
      {locate, 0x60030005, CALL, 1, {Number(TRL_VT_I2, 1)}, TRL_DISP_E_BADPARAMCOUNT, 99},
      {locate,
       0x60030004,
       CALL,
       3,
       {Document(document), Document(document), Number(TRL_VT_I2, 1)},
       TRL_DISP_E_BADPARAMCOUNT,
       99},
      {locate,
       0x60030004,
       CALL,
       6,
       {Document(document), Document(document), Number(TRL_VT_I2, 1), Document(document),
        Document(document), Document(document)},
       TRL_DISP_E_BADPARAMCOUNT,
       99},
      {filter,
       0x60030002,
       CALL,
       2,
       {Number(TRL_VT_I4, 70000), Document(document)},
       TRL_DISP_E_OVERFLOW,
       1},
      {filter, 0x60030002, CALL, 2, {Text("63"), Document(document)}, TRL_DISP_E_TYPEMISMATCH, 1},
      {filter,
       0x60030002,
       CALL,
       2,
       {Number(TRL_VT_I2, 63), Text("<a/>")},
       TRL_DISP_E_TYPEMISMATCH,
       0},
  };
  for (size_t i = 0; i < sizeof cases / sizeof cases[0]; ++i) {
    uint32_t argError = 99;
    TrlValue result = {TRL_VT_EMPTY, {0}, {0}};
    TrlResult got = Invoke(cases[i].object, cases[i].id, cases[i].flags, &result, &argError,
                           cases[i].count, cases[i].args);
    if (got != cases[i].expected || argError != cases[i].argError) {
      fprintf(stderr, "refusal %zu: 0x%08X at %u\n", i, (unsigned)got, argError);
      ++failures;
    }
    CHECK(result.type == TRL_VT_EMPTY);
  }
  CHECK(Read(locate, 0x68030003, TRL_VT_BOOL) == 0);
  CHECK_RESULT(locate->vtbl->Invoke(locate, 0x68030000, &kNull, 0, GET, NULL, NULL, NULL, NULL),
               TRL_E_POINTER);

  const char* names[] = {"start", "objMatchesDOM", "objNothing"};
  TrlDispId ids[3];
  CHECK_RESULT(filter->vtbl->GetIDsOfNames(filter, &kNull, names, 2, 0, ids), TRL_S_OK);
  CHECK(ids[0] == 0x60030002 && ids[1] == 1);
  CHECK_RESULT(filter->vtbl->GetIDsOfNames(filter, &kNull, names, 3, 0, ids),
               TRL_DISP_E_UNKNOWNNAME);
  CHECK(ids[2] == TRL_DISPID_UNKNOWN);
}

/* Another thread may not call an object: the run and its timer live on the creating thread. */
static void* CallFromAnotherThread(void* object) {
  TrlDispatch* locate = object;
  TrlValue result = {TRL_VT_EMPTY, {0}, {0}};
  CHECK_RESULT(Invoke(locate, 0x68030000, GET, &result, NULL, 0, NULL), TRL_E_WRONG_THREAD);
  return NULL;
}

static int ATagHas(TrlDocument* document, const char* attribute) {
  char* text = NULL;
  lib.DocumentXml(document, &text);
  char* a = strstr(text, "<a ");
  char* end = a ? strchr(a, '>') : NULL;
  if (end) *end = '\0';
  int found = a && strstr(a, attribute);
  lib.StringFree(text);
  return found;
}

int main(int argc, char** argv) {
  if (argc != 2 || getenv("XDG_DATA_HOME") == NULL) {
    fprintf(stderr, "usage: XDG_DATA_HOME=<folder> %s <library to register>\n", argv[0]);
    return 2;
  }
  /* Registration keeps the lines it finds and adds one per class. */
  static const char kForeign[] = "other.Thing\t{00000000-0000-0000-0000-000000000001}\t/opt/o.so\n";
  char library[4096], expected[8192];
  snprintf(registryFile, sizeof registryFile, "%s/trllocator", getenv("XDG_DATA_HOME"));
  mkdir(getenv("XDG_DATA_HOME"), 0755);
  mkdir(registryFile, 0755);
  strcat(registryFile, "/classes");
  WriteFile(registryFile, kForeign);
  CHECK(realpath(argv[1], library) != NULL);
  void* registering = dlopen(argv[1], RTLD_NOW | RTLD_LOCAL);
  TrlResult (*registerServer)(void) = NULL;
  *(void**)&registerServer = dlsym(registering, "DllRegisterServer");
  CHECK_RESULT(registerServer(), TRL_S_OK);
  dlclose(registering);
  strcpy(expected, kForeign);
  for (int c = 0; c < CLASSES; ++c) {
    sprintf(expected + strlen(expected), "%s\t%s\t%s\n", kClasses[c].progId, kClasses[c].classId,
            library);
  }
  char* registered = ReadFile(registryFile);
  CHECK(registered && !strcmp(registered, expected));
  free(registered);

  /* A tree with one application of one file, and its fingerprint. */
  char tree[] = "/tmp/trlserver-XXXXXX", path[4200], options[4800], folder[4200] = "";
  CHECK(mkdtemp(tree) != NULL);
  sprintf(path, "%s/App", tree);
  mkdir(path, 0755);
  strcat(path, "/app.bin");
  WriteFile(path, "hello");
  for (const char* c = tree; *c; ++c) folder[strlen(folder)] = *c == '/' ? '\\' : *c;
  sprintf(
      options,
      "<trl_searchoptions><c c_id=\"1\" c_text=\"localhost\" c_name=\"localhost\" c_local=\"1\">"
      "<m m_id=\"1\" m_text=\"\" m_name=\"\" m_type=\"3\"><d d_id=\"1\" d_text=\"%s\\\" "
      "d_search=\"1\" d_search_recurse=\"True\" d_search_d_attributes=\"35\" "
      "d_search_f_attributes=\"35\" d_search_f_properties=\"0\"><d_search_mask/></d></m></c>"
      "</trl_searchoptions>",
      folder);

  TrlDispatch* objects[CLASSES];
  for (int c = 0; c < CLASSES; ++c) {
    objects[c] = Create(c);
    CheckMembers(c, objects[c]);
  }
  TrlDocument* searchOptions = NewDocument(options);
  TrlDocument* applicationOptions = NewDocument("<trl_applicationoptions/>");
  TrlDocument* fingerprint = NewDocument(
      "<trl_fingerprint><a a_id=\"1\" a_name=\"App\"><v v_id=\"1\" v_name=\"1.0\" v_seq=\"1\">"
      "<f f_id=\"1\" f_name=\"app.bin\" f_relpath=\"\" f_weight=\"1\">"
      "<p p_type=\"2\" p_weight=\"1\" p_value=\"5\"/></f></v></a></trl_fingerprint>");
  CheckRefusals(objects[LOCATE], objects[FILTER], fingerprint);
  pthread_t other;
  pthread_create(&other, NULL, CallFromAnotherThread, objects[LOCATE]);
  pthread_join(other, NULL);

  /* Synchronous: each stage by hand, on the caller's documents, then Locate; no events. */
  Sink quiet;
  uint32_t quietCookie = Connect(objects[LOCATE], &quiet, kClasses[LOCATE].eventId);
  TrlDocument *results = NULL, *localFiles = NewDocument(NULL), *matches = NewDocument(NULL);
  TrlDocument* userData = NewDocument("<trl_applicationdata/>");
  {
    TrlValue args[] = {Document(searchOptions), Document(applicationOptions), Document(fingerprint),
                       DocumentRef(&results)};
    TrlValue result = {TRL_VT_EMPTY, {0}, {0}};
    CHECK_RESULT(Invoke(objects[SEARCH], 0x60030003, CALL, &result, NULL, 4, args), TRL_S_OK);
    CHECK(result.type == TRL_VT_TEXT && strstr(result.u.text, "f_name=\"app.bin\""));
    CHECK(results != NULL);
    if (result.type == TRL_VT_TEXT) lib.DocumentLoadXml(localFiles, result.u.text);
    lib.ValueClear(&result);
    CHECK(Read(objects[SEARCH], 0x68030000, TRL_VT_I2) == 3);
  }
  {
    TrlValue args[] = {DocumentRef(&applicationOptions), DocumentRef(&localFiles),
                       DocumentRef(&fingerprint)};
    TrlValue result = {TRL_VT_EMPTY, {0}, {0}};
    TrlDocument* caller = fingerprint;
    CHECK_RESULT(Invoke(objects[COMPARE], 0x60030002, CALL, &result, NULL, 3, args), TRL_S_OK);
    CHECK(result.type == TRL_VT_TEXT && lib.DocumentLoadXml(matches, result.u.text) == TRL_S_OK);
    lib.ValueClear(&result);
    CHECK(fingerprint == caller && Contains(fingerprint, "f_bitmask=\"1\""));
  }
  {
    TrlValue args[] = {Number(TRL_VT_I2, 63), DocumentRef(&matches)};
    CHECK(!ATagHas(matches, "v_name=\"1.0\""));
    CHECK(StartGives(objects[FILTER], 0x60030002, 2, args, "v_name=\"1.0\""));
    CHECK(ATagHas(matches, "v_name=\"1.0\""));
  }
  {
    TrlValue args[] = {DocumentRef(&searchOptions), DocumentRef(&applicationOptions),
                       DocumentRef(&userData), DocumentRef(&matches)};
    CHECK(StartGives(objects[MERGE], 0x60030002, 4, args, "a_name=\"App\""));
    CHECK(Contains(userData, "a_name=\"App\""));
  }
  {
    TrlValue args[] = {Document(searchOptions), Document(applicationOptions), Number(TRL_VT_I2, 63),
                       Document(fingerprint)};
    CHECK(StartGives(objects[LOCATE], 0x60030004, 4, args, "<events"));
    CHECK(Read(objects[LOCATE], 0x68030001, TRL_VT_I4) == 5);
    CHECK(quiet.count == 0);
  }
  Disconnect(objects[LOCATE], &quiet, quietCookie);

  /* Asynchronous Search: its reports in order; the client lets the object go from inside the last
   * one, and it ends only once the run is done with it. */
  Sink searchSink;
  Connect(objects[SEARCH], &searchSink, kClasses[SEARCH].eventId);
  TrlValue yes = Number(TRL_VT_BOOL, -1);
  CHECK_RESULT(Invoke(objects[SEARCH], 0x68030001, PUT, NULL, NULL, 1, &yes), TRL_S_OK);
  CHECK(StartGives(objects[SEARCH], 0x60030003, 1, (TrlValue[]){Document(searchOptions)}, ""));
  CHECK(searchSink.count == 1 && searchSink.events[0].status == 1);
  searchSink.release = objects[SEARCH];
  objects[SEARCH] = NULL;
  PumpUntilEnd(&searchSink, 1);
  CHECK(!strcmp(StatusReports(&searchSink), "1:1 1:2 1:3"));
  CHECK(searchSink.count > 3 && searchSink.events[2].id == 2);
  CHECK(searchSink.lastResults && strstr(searchSink.lastResults, "f_name=\"app.bin\""));
  CHECK(searchSink.references == 0);
  free(searchSink.lastResults);

  /* Asynchronous Locate: its own reports and those of its stages, in order. */
  TrlDispatch* locate = objects[LOCATE];
  TrlValue locateArgs[] = {Document(searchOptions), Document(applicationOptions),
                           Number(TRL_VT_I2, 63), Document(fingerprint)};
  Sink run;
  uint32_t runCookie = Connect(locate, &run, kClasses[LOCATE].eventId);
  CHECK_RESULT(Invoke(locate, 0x68030003, PUT, NULL, NULL, 1, &yes), TRL_S_OK);
  CHECK(StartGives(locate, 0x60030004, 4, locateArgs, ""));
  PumpUntilEnd(&run, 5);
  CHECK(!strcmp(StatusReports(&run), "0:1 1:1 1:2 1:3 2:1 2:2 2:3 3:1 3:2 3:3 4:1 4:2 4:3 5:3"));
  CHECK(run.lastResults && strstr(run.lastResults, "a_name=\"App\"") &&
        strstr(run.lastResults, "<events><search"));
  CHECK(Read(locate, 0x68030000, TRL_VT_I4) == 3);
  Disconnect(locate, &run, runCookie);

  /* Cancelled from the client's sink at the first progress of the search. */
  Sink cancelled;
  uint32_t cancelledCookie = Connect(locate, &cancelled, kClasses[LOCATE].eventId);
  cancelled.cancel = locate;
  cancelled.cancelId = 0x60030005;
  CHECK(StartGives(locate, 0x60030004, 4, locateArgs, ""));
  PumpUntilEnd(&cancelled, 5);
  CHECK(!strcmp(StatusReports(&cancelled), "0:1 1:1 1:2 1:255"));
  CHECK(Read(locate, 0x68030000, TRL_VT_I4) == 255 && Read(locate, 0x68030001, TRL_VT_I4) == 1);
  Disconnect(locate, &cancelled, cancelledCookie);

  /* Factories refuse what they cannot do; the library stays while anything of it is alive. */
  TrlGuid classId = ParseGuid(kClasses[FILTER].classId), unknownClass = kNull;
  TrlClassFactory* factory = NULL;
  void* object = &object;
  CHECK_RESULT(lib.GetClassObject(&unknownClass, &kFactory, &object),
               TRL_CLASS_E_CLASSNOTAVAILABLE);
  CHECK(object == NULL);
  CHECK_RESULT(lib.GetClassObject(&classId, &kFactory, (void**)&factory), TRL_S_OK);
  CHECK_RESULT(factory->vtbl->CreateInstance(factory, (TrlUnknown*)factory, &kDispatch, &object),
               TRL_CLASS_E_NOAGGREGATION);
  CHECK_RESULT(factory->vtbl->CreateInstance(factory, NULL, &kFactory, &object), TRL_E_NOINTERFACE);
  CHECK_RESULT(factory->vtbl->LockServer(factory, 1), TRL_S_OK);
  factory->vtbl->Release(factory);
  for (int c = 0; c < CLASSES; ++c) {
    if (objects[c]) objects[c]->vtbl->Release(objects[c]);
  }
  TrlDocument* documents[] = {
      searchOptions, applicationOptions, fingerprint, results, localFiles, matches, userData};
  for (size_t d = 0; d < sizeof documents / sizeof documents[0]; ++d) {
    CHECK_RESULT(lib.CanUnloadNow(), TRL_S_FALSE);
    CHECK(lib.DocumentRelease(documents[d]) == 0);
  }
  CHECK_RESULT(lib.CanUnloadNow(), TRL_S_FALSE);
  CHECK_RESULT(lib.GetClassObject(&classId, &kFactory, (void**)&factory), TRL_S_OK);
  CHECK_RESULT(factory->vtbl->LockServer(factory, 0), TRL_S_OK);
  factory->vtbl->Release(factory);
  CHECK_RESULT(lib.CanUnloadNow(), TRL_S_OK);

  /* Registering again changes nothing; unregistering gives back the file as it was, or none. */
  CHECK_RESULT(lib.Register(), TRL_S_OK);
  registered = ReadFile(registryFile);
  CHECK(registered && !strcmp(registered, expected));
  free(registered);
  CHECK_RESULT(lib.Unregister(), TRL_S_OK);
  registered = ReadFile(registryFile);
  CHECK(registered && !strcmp(registered, kForeign));
  free(registered);
  remove(registryFile);
  CHECK_RESULT(lib.Register(), TRL_S_OK);
  CHECK_RESULT(lib.Unregister(), TRL_S_OK);
  CHECK(access(registryFile, F_OK) != 0);

  remove(path);
  *strrchr(path, '/') = '\0';
  rmdir(path);
  rmdir(tree);
  dlclose(lib.handle);
  if (failures) fprintf(stderr, "%d checks failed\n", failures);
  return failures != 0;
}
