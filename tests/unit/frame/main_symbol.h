// Included in front of the companion's main.cpp when the test program compiles it: gives main
// another name for the linker.
int main(int argc, char *argv[]) __asm__("CompanionMain");
