// A program whose whole cost is what is loaded with it.
int main() {
  return 0;
}
