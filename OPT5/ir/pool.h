// Free-list memory for the records that trees and statement lists are made of.
//
// Nodes are made and freed by the million, and a pass frees about as many as it makes. A cell is taken from and given
// back to a list of the thread at hand; only the refill and the end of a thread take a lock. Memory stays with the
// process. Under the address sanitizer every record is its own allocation, so that a use after `erase_node` is caught.
//
// The first blocks are small, so that a small unit is. A pool that goes on growing belongs to a unit whose walks miss
// the caches and, with trees spread over thousands of pages, the tables of pages too: its further blocks are huge pages
// where the system has them.
#pragma once

#include <cstddef>
#include <mutex>
#include <new>

constexpr std::size_t HUGE_BLOCK = std::size_t(2) << 20;
void* take_huge_block(); // of HUGE_BLOCK bytes, for good

// Pools of one size with different kinds share no cells: what is made at one time lies together, and stays apart from
// what is made between.
template <std::size_t Size, int Kind = 0>
class record_pool {
public:
    static void* take() {
#ifdef __SANITIZE_ADDRESS__
        return ::operator new(Size);
#else
        if (!head) refill();
        cell* c = head;
        head = c->next;
        return c;
#endif
    }
    static void give(void* p) {
#ifdef __SANITIZE_ADDRESS__
        ::operator delete(p);
#else
        cell* c = static_cast<cell*>(p);
        if (!head) tail = c;
        c->next = head;
        head = c;
#endif
    }

private:
    struct cell {
        cell* next;
    };
    static constexpr std::size_t CELLS_A_BLOCK = 512, SMALL_BLOCKS = HUGE_BLOCK / (Size * CELLS_A_BLOCK);
    static_assert(Size >= sizeof(cell) && Size % alignof(cell) == 0);

    // Gives the cells of an ending thread to the others. `tail` is the last cell of the thread's list: the one that
    // came when the list was empty, since cells are taken and given back at the head.
    struct leaver {
        ~leaver() {
            if (!head) return;
            std::lock_guard<std::mutex> guard(lock);
            tail->next = left_over;
            if (!left_over) left_over_tail = tail;
            left_over = head;
            head = nullptr;
        }
    };

    static void refill() {
        thread_local leaver at_thread_end;
        static_cast<void>(at_thread_end);
        bool is_small;
        {
            std::lock_guard<std::mutex> guard(lock);
            head = left_over;
            tail = left_over_tail;
            left_over = nullptr;
            if (head) return;
            is_small = blocks++ < SMALL_BLOCKS;
        }
        const std::size_t cells = is_small ? CELLS_A_BLOCK : HUGE_BLOCK / Size;
        char* block = static_cast<char*>(is_small ? ::operator new(Size * cells) : take_huge_block());
        for (std::size_t i = cells; i-- > 0;) give(block + i * Size);
    }

    static inline thread_local cell* head = nullptr;
    static inline thread_local cell* tail = nullptr; // valid while `head` is not null
    static inline cell* left_over = nullptr;
    static inline cell* left_over_tail = nullptr;
    static inline std::size_t blocks = 0; // that were taken
    static inline std::mutex lock;
};
