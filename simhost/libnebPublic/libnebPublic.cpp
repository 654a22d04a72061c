// None of this library's calls is modelled yet. It is there because whoever uses the host expects
// two libraries, and it brings the core they share into the process as it will once it has calls.
