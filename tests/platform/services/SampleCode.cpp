// What a test loads to find the bundle around it.
extern "C" int sampleFunction();

extern "C" int sampleFunction() { return 42; }
