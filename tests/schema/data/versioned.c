/* A program that does nothing: only its resources matter to the tests. */
int Start(void) { return 0; }
