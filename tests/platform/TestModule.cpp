// A shared module that only the dynamic-library tests load.
extern "C" __attribute__((visibility("default"))) int kestrel_test_module_answer() { return 42; }
