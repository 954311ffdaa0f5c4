// What the headers of every test are compiled for, see tests/CMakeLists.txt.
int main() {}
