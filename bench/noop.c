// The floor of a program start: linked statically, it does nothing at all.
int main(void) { return 0; }
