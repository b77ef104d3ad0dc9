// How the server's memory is kept. A listing is some ten thousand small pieces, made and freed within one request: what
// the C library does with them costs more than what they are for, and at thousands of devices it gives the pages back
// to the kernel and takes them anew with every request.
//
// Two arenas: small machines have few processors. What is free goes back within a second or two, also when nothing is
// asked any more: a thread of the allocator sees to that.
extern "C" __attribute__((visibility("default"))) const char *malloc_conf; // jemalloc(3), TUNING
const char *malloc_conf = "narenas:2,dirty_decay_ms:1000,muzzy_decay_ms:0,background_thread:true";
