// The floor of a program start: linked statically, it does nothing at all.
// Linked against libxml2 instead, it shows what loading that library costs.
int main(void) { return 0; }
