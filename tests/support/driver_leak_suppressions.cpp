// The PostgreSQL ODBC drivers leak a few bytes per connection (a bare connect
// and disconnect shows it); the leak report is kept to leaks of our own.
extern "C" const char* __lsan_default_suppressions() {
  return "leak:psqlodbcw.so\nleak:psqlodbca.so\n";
}
