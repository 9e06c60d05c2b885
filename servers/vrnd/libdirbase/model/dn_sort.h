// Sorting of singly linked chains, for the pairs of an RDN: stable, without memory, and fast on hostile chains as well.
#pragma once

#include <cstddef>

// Merges two sorted chains; of equal nodes those of `a` come first.
template <typename Node, typename Less>
Node* merge_chains(Node* a, Node* b, Less less)
{
    Node* head = nullptr;
    Node** tail = &head;
    while (a != nullptr && b != nullptr) {
        Node*& from = less(*b, *a) ? b : a;
        *tail = from;
        tail = &from->next;
        from = from->next;
    }
    *tail = a != nullptr ? a : b;
    return head;
}

// Sorts a chain linked by `next` and returns its new head.
template <typename Node, typename Less>
Node* sort_chain(Node* head, Less less)
{
    constexpr std::size_t most_runs = 48;
    Node* runs[most_runs] =
        {};  // runs[i] is empty or a sorted run of 2^i nodes, all of them ahead of those of runs[i - 1]
    std::size_t used = 0;
    while (head != nullptr) {
        Node* run = head;
        head = head->next;
        run->next = nullptr;
        std::size_t i = 0;
        for (; runs[i] != nullptr; ++i) {
            run = merge_chains(runs[i], run, less);
            runs[i] = nullptr;
        }
        runs[i] = run;
        used = i < used ? used : i + 1;
    }
    Node* sorted = nullptr;
    for (std::size_t i = 0; i < used; ++i) {
        sorted = merge_chains(runs[i], sorted, less);
    }
    return sorted;
}
