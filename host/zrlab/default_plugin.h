// Where the plug-in module is that the program loads unless it is given another.
#ifndef ZR_HOST_ZRLAB_DEFAULT_PLUGIN_H
#define ZR_HOST_ZRLAB_DEFAULT_PLUGIN_H

#include <string>

namespace host {

// The file zr_plugin.so beside the program, as a build leaves it; when there is none, the place
// relative to the program where an installation has it. That file need not exist. Any thread.
std::string defaultPlugin();

}  // namespace host

#endif
