// Nothing: what the tests have in common are the headers that are compiled with it.
