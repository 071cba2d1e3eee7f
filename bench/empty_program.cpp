// What starting and ending a program with the tool's libraries costs.
int main() {
    return 0;
}
