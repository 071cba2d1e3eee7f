// Included in front of the tool's main.cpp when the test program compiles it: gives main another
// name for the linker. Its name in the source, which messages carry, stays "main".
int main(int argc, char *argv[]) __asm__("ToolMain");
