#!/usr/bin/env node
// Runs EPANET on the network file net1.inp in this folder and leaves its binary results, net1.out, and its report, net1.rpt.
// The engine is WebAssembly, which has files in memory alone: they are copied in and out.
// Exit codes: 0 the results are complete, 1 the engine has refused the network or could not solve it.
import { readFileSync, writeFileSync } from 'node:fs';
import { Project, Workspace } from 'epanet-js';

const workspace = new Workspace();
await workspace.loadModule();
workspace.writeFile('net1.inp', readFileSync('net1.inp'));
const project = new Project(workspace);
try {
  project.open('net1.inp', 'net1.rpt', 'net1.out');
  project.solveH();
  project.saveH();
  project.close();
} catch (error) {
  console.error(`EPANET: ${error.message}`);
  project.close(); // which completes the report
  const reasons = workspace.readFile('net1.rpt').match(/^.*Error.*(\n.*){0,2}/gm) ?? [];
  console.error(reasons.join('\n'));
  process.exit(1);
}
writeFileSync('net1.rpt', workspace.readFile('net1.rpt'));
writeFileSync('net1.out', workspace.readFile('net1.out', 'binary'));
