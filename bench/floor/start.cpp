// A program that does nothing, linked with the libraries that ours is linked with: what starting
// costs before any code of ours runs.

int main() {}
