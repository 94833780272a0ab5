// Linked into the programs that reach the Avahi daemon over libdbus-1 (the tests, and
// qv-discover); it has an effect only under ThreadSanitizer. libdbus-1 takes two of
// its own mutexes in one order when a connection opens and in the other when it closes
// (both inside libdbus, on the same thread); ThreadSanitizer reports that as a potential
// deadlock. Only reports whose stacks run through libdbus are suppressed.
extern "C" const char* __tsan_default_suppressions() { return "deadlock:libdbus-1.so\n"; }
