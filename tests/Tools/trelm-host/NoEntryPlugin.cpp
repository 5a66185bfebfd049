// A module that looks like a plug-in but offers no getComponents.
extern "C" __attribute__((visibility("default"))) int getComponentList() { return 0; }
