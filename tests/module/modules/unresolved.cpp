// A module that needs a function that nobody has.
extern "C" int nobodyHasThisFunction();
extern "C" int unresolvedModule() {
    return nobodyHasThisFunction();
}
