#pragma once

// What libtrllocator exports. The library is built with every symbol hidden but those of the
// classes marked TRL_API, so that only these headers form its interface. A private type nested in
// such a class would be exported with it: TRL_LOCAL keeps it inside.
#if defined(__GNUC__) || defined(__clang__)
#define TRL_API __attribute__((visibility("default")))
#define TRL_LOCAL __attribute__((visibility("hidden")))
#else
#define TRL_API
#define TRL_LOCAL
#endif
