// Loads the library and does nothing with it.
int main()
{
}
