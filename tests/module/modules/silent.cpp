// A module that registers nothing.
extern "C" int silentModule() {
    return 0;
}
