// The small model that process and integration tests run.
int main() { return 0; }
