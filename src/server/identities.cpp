#include "server/identities.h"

#include <algorithm>

#include "server/guid.h"
#include "server/module.h"

namespace trl::server {
namespace {

using enum ValueKind;
using enum MemberKind;

constexpr TypeLibrary kTypeLibrary{"trlLocator", Guid("D73B53AB-EDF2-471C-B3C3-A7F26172D27F"), 1, 0,
                                   0x409,        "Trellane (Client) Search Interface"};

constexpr ForeignIdentities kForeign{
    Guid("2933BF95-7B36-11D2-B20E-00C04F983E60"), Guid("4124A03D-FA96-45FA-8C66-8264D405C007"),
    Guid("C605E921-86DA-431D-A6EF-525024CCC9F9"), Guid("55D64E04-0062-4846-8E41-E36479EDDC18"),
    Guid("9FCFE650-A90A-4296-8A6C-E11542DDC472"), Guid("D8123C5B-3180-4F4A-9CC3-15A4C8CAC5AD")};

constexpr Parameter kAsynchronousValue[] = {{"fAsynchronous", kBoolean}};
constexpr Parameter kLogFileValue[] = {{"strFilename", kText}};

constexpr Parameter kSearchStart[] = {{"objSearchOptionsDOM", kDocument, false, true},
                                      {"objApplicationOptionsDOM", kDocument, true, true},
                                      {"objFingerprintDOM", kDocument, true, true},
                                      {"objResultsDOM", kDocument, true, true}};
constexpr Parameter kCompareStart[] = {{"objApplicationOptionsDOM", kDocument, false, true},
                                       {"objLocalFilesDOM", kDocument, false, true},
                                       {"objFingerprintDOM", kDocument, false, true}};
constexpr Parameter kFilterStart[] = {{"intFilterOptions", kInt16},
                                      {"objMatchesDOM", kDocument, false, true}};
constexpr Parameter kMergeStart[] = {{"objSearchOptionsDOM", kDocument, false, true},
                                     {"objApplicationOptionsDOM", kDocument, false, true},
                                     {"objOldResultsDOM", kDocument, false, true},
                                     {"objNewResultsDOM", kDocument, false, true}};
constexpr Parameter kLocateStart[] = {{"objSearchOptionsDOM", kDocument},
                                      {"objApplicationOptionsDOM", kDocument},
                                      {"intFilterOptions", kInt16},
                                      {"objFingerprintDOM", kDocument},
                                      {"objUserDataDOM", kDocument, true}};

// _Compare, _Filter and _Merge share their slots and ids; only Start's parameters differ.
#define TRL_STAGE_MEMBERS(start)                                                  \
  {                                                                               \
    {1, "Asynchronous", kPropertyGet, 0x68030001, kBoolean, {}},                  \
        {2, "Asynchronous", kPropertyPut, 0x68030001, kNone, kAsynchronousValue}, \
        {3, "Status", kPropertyGet, 0x68030000, kInt16, {}},                      \
        {4, "Start", kMethod, 0x60030002, kText, start}, {                        \
      5, "Cancel", kMethod, 0x60030003, kNone, {}                                 \
    }                                                                             \
  }

constexpr Member kCompareMembers[] = TRL_STAGE_MEMBERS(kCompareStart);
constexpr Member kFilterMembers[] = TRL_STAGE_MEMBERS(kFilterStart);
constexpr Member kMergeMembers[] = TRL_STAGE_MEMBERS(kMergeStart);
#undef TRL_STAGE_MEMBERS

constexpr Member kSearchMembers[] = {
    {1, "Asynchronous", kPropertyGet, 0x68030001, kBoolean, {}},
    {2, "Asynchronous", kPropertyPut, 0x68030001, kNone, kAsynchronousValue},
    {3, "Status", kPropertyGet, 0x68030000, kInt16, {}},
    {4, "Cancel", kMethod, 0x60030002, kNone, {}},
    {5, "Start", kMethod, 0x60030003, kText, kSearchStart}};

constexpr Member kLocateMembers[] = {
    {1, "Asynchronous", kPropertyPut, 0x68030003, kNone, kAsynchronousValue},
    {2, "Asynchronous", kPropertyGet, 0x68030003, kBoolean, {}},
    {3, "LogFile", kPropertyPut, 0x68030002, kNone, kLogFileValue},
    {4, "LogFile", kPropertyGet, 0x68030002, kText, {}},
    {5, "Mode", kPropertyGet, 0x68030001, kInt32, {}},
    {6, "Status", kPropertyGet, 0x68030000, kInt32, {}},
    {7, "Start", kMethod, 0x60030004, kText, kLocateStart},
    {8, "Cancel", kMethod, 0x60030005, kNone, {}}};

constexpr ClassIdentity kClasses[] = {
    {"Compare", "trlLocator.Compare", Guid("C58C197B-8F7C-40E1-8EE6-835944A1049F"), "_Compare",
     Guid("AF4C1C7A-C434-4304-B679-F94D471FB04D"), "__Compare",
     Guid("FEA3456A-570E-4868-9AE5-D72B5F2D0EBD"), kCompareMembers},
    {"Filter", "trlLocator.Filter", Guid("4C1E74BE-E45A-48DC-A8A0-E718B7AFEE5A"), "_Filter",
     Guid("9D54D732-4800-49E9-B718-1152E6D1130D"), "__Filter",
     Guid("03A7D178-CAB5-4010-A784-FFCBEAE67094"), kFilterMembers},
    {"Locate", "trlLocator.Locate", Guid("9271413F-2B9A-42D9-95ED-E5E3CF6C0072"), "_Locate",
     Guid("02F12903-3DE1-4AE6-8005-46CEA1F67FBB"), "__Locate",
     Guid("D4466B3B-5B80-401E-8A3D-0C21B609E7E9"), kLocateMembers},
    {"Merge", "trlLocator.Merge", Guid("1C048253-E86E-4B5A-BBB0-5B4FD327D28B"), "_Merge",
     Guid("5B149139-0019-4E90-AA4B-405DD91561C8"), "__Merge",
     Guid("E07E4053-37B4-420E-A0B4-70FB6F023D5D"), kMergeMembers},
    {"Search", "trlLocator.Search", Guid("DCFC2C95-651D-46A8-A31E-6EE58125C2E3"), "_Search",
     Guid("C7593F0D-CF9E-450A-AF16-BD0AAE7AB1FE"), "__Search",
     Guid("0159F6AA-64AE-4962-8A87-879E2F090366"), kSearchMembers}};

constexpr Parameter kStatusUpdateParameters[] = {{"strUpdateXML", kText}, {"strResultsXML", kText}};
constexpr Parameter kProgressUpdateParameters[] = {{"strUpdateXML", kText}};
constexpr Event kEvents[] = {{"StatusUpdate", 1, kStatusUpdateParameters},
                             {"ProgressUpdate", 2, kProgressUpdateParameters}};

}  // namespace

const TypeLibrary& ComponentTypeLibrary() { return kTypeLibrary; }

const ForeignIdentities& Foreign() { return kForeign; }

std::span<const ClassIdentity> Classes() { return kClasses; }

std::span<const Event> Events() { return kEvents; }

const ClassIdentity* FindClass(const TrlGuid& classId) {
  auto found = std::ranges::find_if(
      kClasses, [&](const ClassIdentity& c) { return SameGuid(c.classId, classId); });
  return found == std::end(kClasses) ? nullptr : &*found;
}

const ClassIdentity* FindClass(std::string_view progId) {
  auto found = std::ranges::find_if(
      kClasses, [&](const ClassIdentity& c) { return EqualIgnoringCase(c.progId, progId); });
  return found == std::end(kClasses) ? nullptr : &*found;
}

}  // namespace trl::server
