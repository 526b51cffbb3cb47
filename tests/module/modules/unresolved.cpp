// A module that needs a function that is defined nowhere.
extern "C" int nobodyHasThisFunction();
extern "C" int unresolvedModule() {
    return nobodyHasThisFunction();
}
