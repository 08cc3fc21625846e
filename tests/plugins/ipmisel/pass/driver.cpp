extern "C" int TheDriver() { return 0; }
